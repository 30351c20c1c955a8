#include "Testing/FakeKeychainManager.h"

#include "Testing/FakeAccount.h"
#include "Testing/TraceValue.h"

namespace palisade {
namespace {

std::string idOf(const std::shared_ptr<Account>& account) { return account == nullptr ? "" : FakeAccount::idOf(*account); }

}  // namespace

void FakeKeychainManager::addCredential(const std::string& accountID, const std::optional<std::string>& clientID,
                                        std::optional<std::string> oauthToken) {
  const std::lock_guard lock(_mutex);
  _entries[{accountID, clientID}] = std::make_shared<const AccountCredential>(std::move(oauthToken), "", distantFuture);
}

std::shared_ptr<const AccountCredential> FakeKeychainManager::entry(const std::string& accountID,
                                                                    const std::optional<std::string>& clientID) const {
  const std::lock_guard lock(_mutex);
  const auto found = _entries.find({accountID, clientID});
  return found == _entries.end() ? nullptr : found->second;
}

void FakeKeychainManager::refuseWrites(std::optional<Error> error) {
  const std::lock_guard lock(_mutex);
  _writeRefusal = std::move(error);
}

void FakeKeychainManager::refuseRemovals(std::optional<Error> error) {
  const std::lock_guard lock(_mutex);
  _removalRefusal = std::move(error);
}

std::shared_ptr<const AccountCredential> FakeKeychainManager::credentialForAccount(const std::shared_ptr<Account>& account,
                                                                                   const std::optional<std::string>& clientID) {
  _instruments.faults.enter("KeychainManager.credentialForAccount");
  _instruments.trace.record("KeychainManager.credentialForAccount",
                            {{"account", traceAccount(account.get())}, {"clientID", traceText(clientID)}});
  return entry(idOf(account), clientID);
}

std::optional<Error> FakeKeychainManager::setCredentialForAccount(const std::shared_ptr<Account>& account,
                                                                  const std::optional<std::string>& clientID) {
  _instruments.faults.enter("KeychainManager.setCredentialForAccount");
  std::shared_ptr<const AccountCredential> credential;
  {
    const FaultInjector::Pause pause;
    if (account != nullptr) credential = account->credential();
  }
  _instruments.trace.record("KeychainManager.setCredentialForAccount", {{"account", traceAccount(account.get())},
                                                                        {"clientID", traceText(clientID)},
                                                                        {"credential", traceCredential(credential)}});
  const std::lock_guard lock(_mutex);
  if (_writeRefusal) return _writeRefusal;
  _entries[{idOf(account), clientID}] = std::move(credential);
  return std::nullopt;
}

std::optional<Error> FakeKeychainManager::removeCredentialForAccount(const std::shared_ptr<Account>& account,
                                                                     const std::optional<std::string>& clientID) {
  _instruments.faults.enter("KeychainManager.removeCredentialForAccount");
  _instruments.trace.record("KeychainManager.removeCredentialForAccount",
                            {{"account", traceAccount(account.get())}, {"clientID", traceText(clientID)}});
  const std::lock_guard lock(_mutex);
  if (_removalRefusal) return _removalRefusal;
  _entries.erase({idOf(account), clientID});
  return std::nullopt;
}

}  // namespace palisade
