#include "Host/Daemon/CrashRepair.h"

#include <algorithm>

#include "Host/Accounts/SqliteAccountStore.h"
#include "Host/Accounts/StoredAccount.h"
#include "Host/Keychain/Keychain.h"
#include "Host/Vantad/Outbox.h"
#include "Platform/AccountConstants.h"
#include "Platform/Client.h"

namespace palisade {
namespace {

const StoredAuthorization* recordOf(const std::vector<StoredAuthorization>& records, const std::string& clientID) {
  const auto found = std::ranges::find_if(
      records, [&](const StoredAuthorization& stored) { return stored.record->client()->bundleID() == clientID; });
  return found == records.end() ? nullptr : &*found;
}

const std::string* appIDOf(const StoredAuthorization* stored) {
  if (stored == nullptr || stored->record->options() == nullptr) return nullptr;
  const Value* appID = stored->record->options()->find(FacebookAppIdKey);
  return appID == nullptr ? nullptr : appID->string();
}

void repairAccount(const AccountRecord& account, SqliteAccountStore& store, Keychain& keychain, Outbox& outbox,
                   std::vector<std::string>& report) {
  const auto records = store.storedAuthorizations(account.accountTypeIdentifier);
  const auto object = std::make_shared<StoredAccount>(account.id, account.username, account.description);
  for (const std::string& clientID : keychain.clientIDsWithCredentials(object)) {
    const StoredAuthorization* stored = recordOf(records, clientID);
    if (stored != nullptr && stored->record->isGranted()) continue;
    // First the queue, then the keychain: a second crash in between repeats the harmless half.
    if (const std::string* appID = appIDOf(stored)) outbox.add(account.id, *appID);
    if (const auto error = keychain.removeCredentialForAccount(object, clientID)) {
      report.push_back("The token of " + clientID +
                       " has no grant and could not be removed: " + error->description.value_or("the keychain refused") + ".");
    } else {
      report.push_back("The token of " + clientID + " had no grant and was removed.");
    }
  }
}

}  // namespace

std::vector<std::string> repairAfterCrash(SqliteAccountStore& store, Keychain& keychain, Outbox& outbox) {
  std::vector<std::string> report;
  store.removeAllAnswersByNobody();
  for (const AccountRecord& account : store.accounts()) {
    try {
      repairAccount(account, store, keychain, outbox, report);
    } catch (const std::exception& failure) {
      report.push_back("The tokens of the account " + account.description + " could not be checked: " + failure.what());
    }
  }
  return report;
}

}  // namespace palisade
