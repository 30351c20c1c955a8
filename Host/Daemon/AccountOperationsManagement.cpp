#include <algorithm>
#include <future>

#include "Host/Accounts/StoredAccount.h"
#include "Host/Bus/BusLoop.h"
#include "Host/Daemon/AccountOperations.h"
#include "Host/Daemon/AtEnd.h"
#include "Host/Daemon/OperationStore.h"
#include "Host/Daemon/StoreCall.h"
#include "Host/Keychain/KeychainError.h"
#include "Host/Preferences/TomlFile.h"
#include "Host/Vantad/Departures.h"
#include "Platform/AccountConstants.h"
#include "Platform/AccountType.h"

// What the person who manages accounts and grants asks for. Every operation refuses a sandboxed caller first.

namespace palisade {
namespace {

constexpr std::size_t longestToken = 64 * 1024;
constexpr std::size_t mostTokenTransfers = 32;

Value textOrNull(const std::optional<std::string>& text) { return text ? Value(*text) : Value(); }

Array namesOf(const PermissionSetRef& permissions) {
  if (permissions == nullptr) return {};
  std::vector<std::string> names(permissions->begin(), permissions->end());
  std::ranges::sort(names);
  return {names.begin(), names.end()};
}

std::int64_t unixTime(Date date) { return date.time_since_epoch().count(); }

Value optionOf(const ClientAuthorization& record, std::string_view key) {
  const Value* value = record.options() == nullptr ? nullptr : record.options()->find(key);
  return value == nullptr ? Value() : *value;
}

Dictionary rowOf(const StoredAuthorization& stored) {
  const ClientAuthorization& record = *stored.record;
  return {{"client", stored.clientID},
          {"name", record.client()->localizedAppName()},
          {"account_type", stored.accountTypeIdentifier},
          {"granted", record.isGranted()},
          {"app_id", optionOf(record, FacebookAppIdKey)},
          {"audience", optionOf(record, FacebookAudienceKey)},
          {"permissions", namesOf(record.grantedPermissions())},
          {"changed", unixTime(stored.updatedAt)}};
}

template <typename Call>
auto preferenceCall(const Call& call) {
  try {
    return call();
  } catch (const TomlError& error) {
    throw BusFailure(BusFailureKind::invalidArguments, error.what());
  }
}

}  // namespace

Rows AccountOperations::listAccounts(const BusCaller& caller, const std::string& accountType) {
  refuseUnlessManager(caller);
  Rows rows;
  for (const AccountRecord& account : _parts.store.accounts()) {
    if (!accountType.empty() && account.accountTypeIdentifier != accountType) continue;
    rows.push_back({{"id", account.id},
                    {"account_type", account.accountTypeIdentifier},
                    {"username", account.username},
                    {"description", account.description}});
  }
  return rows;
}

std::string AccountOperations::addAccount(const BusCaller& caller, const std::string& accountType, const std::string& username,
                                          const std::function<std::string()>& readToken) {
  refuseUnlessManager(caller);
  pluginFor(accountType);
  if (username.empty()) throw BusFailure(BusFailureKind::invalidArguments, "An account needs a user name.");
  BusLoop::handOver();
  std::string token = readToken();
  while (token.ends_with('\n') || token.ends_with('\r')) token.pop_back();
  if (token.empty() || token.size() > longestToken) {
    throw BusFailure(BusFailureKind::invalidArguments, "An account needs a token of at most 64 KiB.");
  }
  // One at a time: an account that another addition is giving its token would look like one that was cut off.
  const std::lock_guard addition(_addition);
  const auto accounts = storeCall([&] { return _parts.store.accounts(); });
  const auto found = std::ranges::find_if(accounts, [&](const AccountRecord& other) {
    return other.accountTypeIdentifier == accountType && other.username == username;
  });
  // An account without a token is what an addition leaves that was cut off: this one brings it to its end. One whose token lies
  // under a lost key, or was tampered with, is signed in to again.
  const bool isNew = found == accounts.end();
  if (!isNew && hasToken(*found)) {
    throw BusFailure(BusFailureKind::invalidArguments, "There is an account '" + username + "' of this type already.");
  }
  const AccountRecord record =
      isNew ? storeCall([&] { return _parts.store.addAccount(accountType, username, username); }) : *found;
  const auto account = std::make_shared<StoredAccount>(record.id, record.username, record.description);
  account->setCredential(std::make_shared<const AccountCredential>(std::move(token), "", distantFuture));
  if (const auto error = _parts.keychain.setCredentialForAccount(account, std::nullopt)) {
    if (isNew) _parts.store.removeAccount(record.id);
    throw BusFailure(BusFailureKind::keychainUnavailable, error->description.value_or("The keychain refused the token."));
  }
  return record.id;
}

bool AccountOperations::hasToken(const AccountRecord& account) {
  const auto object = std::make_shared<StoredAccount>(account.id, account.username, account.description);
  try {
    return _parts.keychain.credentialForAccount(object, std::nullopt) != nullptr;
  } catch (const KeychainError& failure) {
    if (failure.code() == KeychainErrorKeyLost || failure.code() == KeychainErrorTampered) return false;
    throw BusFailure(BusFailureKind::keychainUnavailable, failure.what());
  } catch (const std::exception& failure) {
    throw BusFailure(BusFailureKind::keychainUnavailable, failure.what());
  }
}

// Each transfer holds a thread and four descriptors, so there are only so many: of a connection, and of all together.
std::shared_ptr<const void> AccountOperations::admitToken(const BusCaller& caller) {
  const std::lock_guard lock(_mutex);
  std::size_t all = 0;
  for (const auto& [connection, count] : _tokenTransfers) all += count;
  const auto own = _tokenTransfers.find(caller.uniqueName);
  if (all >= mostTokenTransfers || (own != _tokenTransfers.end() && own->second >= longestLane)) {
    throw BusFailure(BusFailureKind::tooManyRequests, "Too many tokens are being sent. Finish one first, or try again later.");
  }
  ++_tokenTransfers[caller.uniqueName];
  return std::shared_ptr<const void>(nullptr, [this, connection = caller.uniqueName](const void*) {
    const std::lock_guard guard(_mutex);
    const auto transfers = _tokenTransfers.find(connection);
    if (--transfers->second == 0) _tokenTransfers.erase(transfers);
  });
}

void AccountOperations::removeAccount(const BusCaller& caller, const std::string& id) {
  refuseUnlessManager(caller);
  const auto accounts = storeCall([&] { return _parts.store.accounts(); });
  const auto found = std::ranges::find(accounts, id, &AccountRecord::id);
  if (found == accounts.end()) {
    throw BusFailure(BusFailureKind::noSuchAccount, "There is no account '" + id + "'. `palisade account list` shows them.");
  }
  // What was granted belongs to the first account of its type; only that one's removal takes it along.
  const auto first = std::ranges::find(accounts, found->accountTypeIdentifier, &AccountRecord::accountTypeIdentifier);
  if (first == found) revokeAll(caller, found->accountTypeIdentifier);
  // The account's token signs the invalidations that are still to come, so it goes when they are settled.
  storeCall([&] { _parts.outbox.noteDeparture(id); });
  storeCall([&] { return _parts.store.removeAccount(id); });
  storeCall([&] { removeTokensOfDepartedAccounts(_parts.outbox, _parts.keychain); });
}

Rows AccountOperations::listGrants(const BusCaller& caller, const std::string& accountType) {
  refuseUnlessManager(caller);
  Rows rows;
  for (const StoredAuthorization& stored : storeCall([&] { return _parts.store.storedAuthorizations(accountType); })) {
    // What nobody answered is about to be removed.
    if (!stored.isAnsweredByNobody) rows.push_back(rowOf(stored));
  }
  return rows;
}

void AccountOperations::revoke(const BusCaller& caller, const std::string& accountType, const std::string& clientID) {
  refuseUnlessManager(caller);
  const auto stored = _parts.store.storedAuthorizations(accountType);
  const auto found = std::ranges::find(stored, clientID, &StoredAuthorization::clientID);
  std::shared_ptr<const Client> client;
  if (found != stored.end()) {
    client = found->record->client();
  } else {
    client = registeredClient(clientID);
  }
  const auto hold = _lanes.hold(clientID);
  revokeOperations([&](const Running& running) { return running.client == clientID; });
  refuseUnlessStored(
      _parts.store.noteIntent({.kind = Intent::Kind::revocation, .accountTypeIdentifier = accountType, .clientID = clientID}));
  manage(accountType, [&](auto& plugin, const auto& type, const auto& store, auto completion) {
    plugin.revokeAccessToAccountsOfType(type, client, store, std::move(completion));
  });
  // A client that never had a record gets none.
  _parts.store.forgetIntent(AccountType(accountType), clientID);
}

void AccountOperations::revokeAll(const BusCaller& caller, const std::string& accountType) {
  refuseUnlessManager(caller);
  const auto hold = _lanes.holdAll();
  revokeOperations([](const Running&) { return true; });
  refuseUnlessStored(_parts.store.noteRemovalOfAllClients(AccountType(accountType)));
  manage(accountType, [&](auto& plugin, const auto& type, const auto& store, auto completion) {
    plugin.revokeAllAccessToAccountsOfType(type, store, std::move(completion));
  });
}

// The server may issue a token to what is cancelled here, so that token is taken back like one that was stored. All of this
// comes before the revocation is noted, in whose place the note of a grant stands until then.
void AccountOperations::revokeOperations(const Withdrawable& areMeant) {
  const auto operations = operationsThat(areMeant);
  for (const auto& operation : operations) operation->revoke();
  // A refusal that nobody gave stands until its operation ends. It must not become one that the revocation finds.
  if (!operations.empty()) refuseUnlessStored(_parts.store.removeAllAnswersByNobody());
  for (const auto& operation : operations) {
    const auto appID = operation->appOfAskedToken();
    const auto accounts = storeCall([&] { return _parts.store.accounts(); });
    const auto account =
        std::ranges::find(accounts, operation->grant()->accountTypeIdentifier, &AccountRecord::accountTypeIdentifier);
    if (appID && account != accounts.end()) storeCall([&] { _parts.outbox.add(account->id, *appID); });
  }
}

// A revocation says that it was handled, or why it was not.
void AccountOperations::manage(const std::string& accountType, const PluginCall& call) {
  const auto plugin = pluginFor(accountType);
  const auto operation = std::make_shared<Operation>(nullptr);
  operation->userHasAnswered();
  const OperationScope scope(*operation);
  std::promise<AccessOutcome> outcome;
  call(*plugin, std::make_shared<const AccountType>(accountType), std::make_shared<OperationStore>(_parts.store, operation),
       [&](bool handled, const std::optional<Error>& error) {
         outcome.set_value({.response = handled ? AccessResponse::granted : AccessResponse::refused, .error = error});
       });
  const AccessOutcome result = outcome.get_future().get();
  if (result.response != AccessResponse::granted) {
    throw BusFailure(BusFailureKind::failed, result.error && result.error->description ? *result.error->description
                                                                                       : "The revocation was not carried out.");
  }
  if (const auto failure = operation->failure()) throw BusFailure(*failure);
}

Rows AccountOperations::history(const BusCaller& caller, std::uint32_t limit, const std::optional<std::string>& client) {
  refuseUnlessManager(caller);
  Rows rows;
  for (const HistoryEntry& entry : _parts.history.entries({.limit = limit, .bundleID = client})) {
    rows.push_back({{"first", unixTime(entry.first)},
                    {"last", unixTime(entry.last)},
                    {"count", entry.count},
                    {"account_type", entry.accountTypeIdentifier},
                    {"client", textOrNull(entry.bundleID)},
                    {"granted", entry.granted},
                    {"prompted", entry.userPrompted},
                    {"elapsed", entry.elapsedSeconds}});
  }
  return rows;
}

Rows AccountOperations::listRevocations(const BusCaller& caller) {
  refuseUnlessManager(caller);
  return _parts.revocations();
}

Rows AccountOperations::listClients(const BusCaller& caller) {
  refuseUnlessManager(caller);
  Rows rows;
  for (const auto& client : _parts.clients.clients()) {
    rows.push_back({{"bundle_id", textOrNull(client->bundleID())},
                    {"name", client->localizedAppName()},
                    {"class", nameOf(client->clientClass())},
                    {"entitlements", Array(client->entitlements().begin(), client->entitlements().end())},
                    {"file", client->recordFile()}});
  }
  return rows;
}

std::optional<Value> AccountOperations::preference(const BusCaller& caller, const std::string& domain, const std::string& key) {
  refuseUnlessManager(caller);
  return preferenceCall(
      [&] { return _parts.preferences.copyValue(key, domain, PreferencesUser::current, PreferencesHost::any); });
}

void AccountOperations::setPreference(const BusCaller& caller, const std::string& domain, const std::string& key,
                                      const std::optional<Value>& value) {
  refuseUnlessManager(caller);
  preferenceCall([&] { _parts.preferences.set(domain, key, value); });
}

Dictionary AccountOperations::status(const BusCaller& caller) {
  refuseUnlessManager(caller);
  return _parts.status();
}

}  // namespace palisade
