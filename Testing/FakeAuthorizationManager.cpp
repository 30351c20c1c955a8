#include "Testing/FakeAuthorizationManager.h"

#include <algorithm>
#include <utility>

#include "Platform/AccountType.h"
#include "Testing/FakeClient.h"
#include "Testing/TraceValue.h"

namespace palisade {
namespace {

// Shares nothing with the original, so that nobody changes the store through options or permissions that were cast or kept.
ClientAuthorization detachedCopyOf(const ClientAuthorization& record) {
  ClientAuthorization copy(record);
  if (record.options() != nullptr) copy.setOptions(std::make_shared<const Dictionary>(*record.options()));
  if (record.grantedPermissions() != nullptr) {
    copy.setGrantedPermissions(std::make_shared<const PermissionSet>(*record.grantedPermissions()));
  }
  return copy;
}

}  // namespace

void FakeAuthorizationManager::addRecord(const ClientAuthorization& record, const std::string& accountTypeIdentifier) {
  put({.clientID = FakeClient::idOf(*record.client()),
       .accountTypeIdentifier = accountTypeIdentifier,
       .record = detachedCopyOf(record)});
}

std::shared_ptr<ClientAuthorization> FakeAuthorizationManager::recordOf(const Client& client,
                                                                        const std::string& accountTypeIdentifier) const {
  const std::string clientID = FakeClient::idOf(client);
  const std::lock_guard lock(_mutex);
  for (const Entry& entry : _entries) {
    if (entry.clientID == clientID && entry.accountTypeIdentifier == accountTypeIdentifier) {
      return std::make_shared<ClientAuthorization>(detachedCopyOf(entry.record));
    }
  }
  return nullptr;
}

void FakeAuthorizationManager::answerWrites(std::vector<std::optional<Error>> answers) {
  const std::lock_guard lock(_mutex);
  _writeAnswers = std::move(answers);
  _writes = 0;
}

void FakeAuthorizationManager::answerRemovals(std::optional<Error> answer) {
  const std::lock_guard lock(_mutex);
  _removalAnswer = std::move(answer);
}

std::shared_ptr<ClientAuthorization> FakeAuthorizationManager::authorizationForClient(
    const std::shared_ptr<const Client>& client, const AccountType& accountType) {
  _instruments.faults.enter("AuthorizationManager.authorizationForClient");
  _instruments.trace.record("AuthorizationManager.authorizationForClient",
                            {{"client", traceClient(client.get())}, {"accountType", accountType.identifier()}});
  return client == nullptr ? nullptr : recordOf(*client, accountType.identifier());
}

std::vector<std::shared_ptr<ClientAuthorization>> FakeAuthorizationManager::allAuthorizationsForAccountType(
    const AccountType& accountType) {
  _instruments.faults.enter("AuthorizationManager.allAuthorizationsForAccountType");
  _instruments.trace.record("AuthorizationManager.allAuthorizationsForAccountType",
                            {{"accountType", accountType.identifier()}});
  std::vector<std::shared_ptr<ClientAuthorization>> records;
  const std::lock_guard lock(_mutex);
  for (const Entry& entry : _entries) {
    if (entry.accountTypeIdentifier != accountType.identifier()) continue;
    records.push_back(std::make_shared<ClientAuthorization>(detachedCopyOf(entry.record)));
  }
  return records;
}

std::optional<Error> FakeAuthorizationManager::setAuthorization(const ClientAuthorization& authorization,
                                                                const std::shared_ptr<const Client>& forClient,
                                                                const AccountType& onAccountType) {
  _instruments.faults.enter("AuthorizationManager.setAuthorization");
  _instruments.trace.record("AuthorizationManager.setAuthorization", {{"client", traceClient(forClient.get())},
                                                                      {"accountType", onAccountType.identifier()},
                                                                      {"record", traceRecord(authorization)}});
  {
    const std::lock_guard lock(_mutex);
    const std::size_t write = _writes++;
    if (write < _writeAnswers.size() && _writeAnswers[write]) return _writeAnswers[write];
  }
  put({.clientID = FakeClient::idOf(*forClient),
       .accountTypeIdentifier = onAccountType.identifier(),
       .record = detachedCopyOf(authorization)});
  return std::nullopt;
}

std::optional<Error> FakeAuthorizationManager::removeAllClientAuthorizationsForAccountType(const AccountType& accountType) {
  _instruments.faults.enter("AuthorizationManager.removeAllClientAuthorizationsForAccountType");
  _instruments.trace.record("AuthorizationManager.removeAllClientAuthorizationsForAccountType",
                            {{"accountType", accountType.identifier()}});
  const std::lock_guard lock(_mutex);
  if (_removalAnswer) return _removalAnswer;
  std::erase_if(_entries, [&](const Entry& entry) { return entry.accountTypeIdentifier == accountType.identifier(); });
  return std::nullopt;
}

void FakeAuthorizationManager::put(Entry entry) {
  const std::lock_guard lock(_mutex);
  const auto earlier = std::ranges::find_if(_entries, [&](const Entry& each) {
    return each.clientID == entry.clientID && each.accountTypeIdentifier == entry.accountTypeIdentifier;
  });
  if (earlier == _entries.end()) {
    _entries.push_back(std::move(entry));
  } else {
    *earlier = std::move(entry);
  }
}

}  // namespace palisade
