#include "Host/Daemon/CrashRepair.h"

#include <algorithm>

#include "Host/Accounts/SqliteAccountStore.h"
#include "Host/Accounts/StoredAccount.h"
#include "Host/Keychain/Keychain.h"
#include "Host/Vantad/Departures.h"
#include "Host/Vantad/Outbox.h"
#include "Platform/AccountConstants.h"
#include "Platform/AccountType.h"
#include "Platform/Client.h"

namespace palisade {
namespace {

std::optional<std::string> appIDOf(const std::optional<StoredAuthorization>& stored) {
  if (!stored || stored->record->options() == nullptr) return std::nullopt;
  const Value* appID = stored->record->options()->find(FacebookAppIdKey);
  return appID == nullptr || appID->string() == nullptr ? std::nullopt : std::optional(*appID->string());
}

bool isGranted(const std::optional<StoredAuthorization>& stored) { return stored && stored->record->isGranted(); }

void orThrow(const std::optional<Error>& error) {
  if (error) throw std::runtime_error(error->description.value_or("It was refused."));
}

class Repair {
 public:
  Repair(SqliteAccountStore& store, Keychain& keychain, Outbox& outbox) : _store(store), _keychain(keychain), _outbox(outbox) {}

  std::vector<std::string> carryOut() {
    _store.removeAllAnswersByNobody();
    attempt("The removal of accounts could not be finished: ", [&] {
      for (const std::string& accountID : _outbox.departures()) _store.removeAccount(accountID);
      removeTokensOfDepartedAccounts(_outbox, _keychain);
    });
    const auto accounts = _store.accounts();
    for (const Intent& intent : _store.intents()) {
      const auto account = std::ranges::find(accounts, intent.accountTypeIdentifier, &AccountRecord::accountTypeIdentifier);
      attempt("What was begun with the access of " + intent.clientID + " could not be brought to an end: ",
              [&] { finish(intent, account == accounts.end() ? nullptr : &*account); });
    }
    for (const AccountRecord& account : accounts) {
      attempt("The tokens of the account " + account.description + " could not be checked: ",
              [&] { removeTokensWithoutGrant(account); });
    }
    return std::move(_report);
  }

 private:
  template <typename Work>
  void attempt(const std::string& trouble, const Work& work) {
    try {
      work();
    } catch (const std::exception& failure) {
      _report.push_back(trouble + failure.what());
    }
  }

  // A grant that was cut off is undone: nobody was told of it. A revocation is finished: somebody wanted it.
  void finish(const Intent& intent, const AccountRecord* account) {
    const AccountType accountType(intent.accountTypeIdentifier);
    const auto stored = _store.storedAuthorization(intent.accountTypeIdentifier, intent.clientID);
    const bool isCutGrant = intent.kind == Intent::Kind::grant && !isGranted(stored);
    if (account != nullptr && (isCutGrant || intent.kind != Intent::Kind::grant)) {
      takeBackToken(*account, intent.clientID, intent.appID ? intent.appID : appIDOf(stored));
    }
    if (intent.kind == Intent::Kind::revocation && stored) {
      stored->record->setIsGranted(false);
      stored->record->setGrantedPermissions(nullptr);
      orThrow(_store.setAuthorization(*stored->record, stored->record->client(), accountType));
    }
    if (intent.kind == Intent::Kind::removal) orThrow(_store.removeAuthorization(accountType, intent.clientID));
    orThrow(_store.forgetIntent(accountType, intent.clientID));
    if (isCutGrant) _report.push_back("The grant of " + intent.clientID + " was cut off and has been undone.");
    if (intent.kind != Intent::Kind::grant) {
      _report.push_back("The revocation of " + intent.clientID + " was cut off and has been finished.");
    }
  }

  void removeTokensWithoutGrant(const AccountRecord& account) {
    for (const std::string& clientID : _keychain.clientIDsWithCredentials(objectOf(account))) {
      const auto stored = recordOfBundle(account.accountTypeIdentifier, clientID);
      if (isGranted(stored)) continue;
      attempt("The token of " + clientID + " has no grant and could not be removed: ", [&] {
        takeBackToken(account, clientID, appIDOf(stored));
        _report.push_back("The token of " + clientID + " had no grant and was removed.");
      });
    }
  }

  // A grant rather than another record. The bundle ID counts that a client has now: by that one its token is found.
  std::optional<StoredAuthorization> recordOfBundle(const std::string& accountTypeIdentifier, const std::string& bundleID) {
    std::optional<StoredAuthorization> found;
    for (StoredAuthorization& stored : _store.storedAuthorizationsOfBundle(accountTypeIdentifier, bundleID)) {
      if (stored.record->client()->bundleID() == bundleID && !isGranted(found)) found = std::move(stored);
    }
    return found;
  }

  // First the queue, then the keychain: a second crash in between repeats the harmless half.
  void takeBackToken(const AccountRecord& account, const std::string& clientID, const std::optional<std::string>& appID) {
    if (appID) _outbox.add(account.id, *appID);
    orThrow(_keychain.removeCredentialForAccount(objectOf(account), clientID));
  }

  static std::shared_ptr<Account> objectOf(const AccountRecord& account) {
    return std::make_shared<StoredAccount>(account.id, account.username, account.description);
  }

  SqliteAccountStore& _store;
  Keychain& _keychain;
  Outbox& _outbox;
  std::vector<std::string> _report;
};

}  // namespace

std::vector<std::string> repairAfterCrash(SqliteAccountStore& store, Keychain& keychain, Outbox& outbox) {
  return Repair(store, keychain, outbox).carryOut();
}

}  // namespace palisade
