#include "Host/Vantad/Departures.h"

#include <memory>

#include "Host/Accounts/StoredAccount.h"

namespace palisade {
namespace {

bool isRemoved(KeychainManager& keychain, const std::string& accountID) {
  try {
    return !keychain.removeCredentialForAccount(std::make_shared<StoredAccount>(accountID, "", ""), std::nullopt);
  } catch (const std::exception&) {
    return false;
  }
}

}  // namespace

void removeTokensOfDepartedAccounts(Outbox& outbox, KeychainManager& keychain) {
  for (const std::string& accountID : outbox.settledDepartures()) {
    if (isRemoved(keychain, accountID)) outbox.forgetDeparture(accountID);
  }
}

}  // namespace palisade
