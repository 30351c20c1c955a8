// Revocation: one client's grant, or every client's.
//
// The token is invalidated through the social daemon, the stored credential removed, and the record cleared or deleted. Nobody
// waits for the invalidation. The completion always says that the revocation was handled; what a service refuses is the
// service's care.

#include "Facebook/Palisade/ExactlyOnce.h"
#include "Facebook/Palisade/StoredAppID.h"
#include "Facebook/Palisade/VXFacebookAccountAccessPlugin.h"
#include "Platform/AccountStore.h"
#include "Platform/AccountType.h"
#include "Platform/AuthorizationManager.h"
#include "Platform/Client.h"
#include "Platform/KeychainManager.h"
#include "Platform/SocialFramework.h"

namespace palisade {
namespace {

constexpr const char* revokeAccess = "revokeAccessToAccountsOfType:forClient:store:completion:";
constexpr const char* revokeAllAccess = "revokeAllAccessToAccountsOfType:store:withCompletion:";

constexpr std::string_view foundAppID = "Found Facebook app ID: %@ for client: %@";
constexpr std::string_view invalidatingToken = "Contacting vantad to invalidate token for client: %@";
constexpr std::string_view removingCredential = "Removing credential from keychain for client: %@";

}  // namespace

void VXFacebookAccountAccessPlugin::revokeAccessToAccountsOfType(std::shared_ptr<const AccountType> accountType,
                                                                 std::shared_ptr<const Client> forClient,
                                                                 std::shared_ptr<AccountStore> store,
                                                                 AccessCompletion completion) {
  const auto revoke = [&](const AccessCompletion& answer) {
    if (const auto account = _accountOfType(accountType, *store)) {
      _revokeAccess(*accountType, forClient, account, store->authorizationManager());
    }
    answer(true, std::nullopt);
  };
  answerExactlyOnce(std::move(completion), log(), revokeAccess, std::ref(revoke));
}

void VXFacebookAccountAccessPlugin::_revokeAccess(const AccountType& accountType, const std::shared_ptr<const Client>& client,
                                                  const std::shared_ptr<Account>& account,
                                                  AuthorizationManager& authorizations) const {
  const auto record = authorizations.authorizationForClient(client, accountType);
  if (record == nullptr) {
    log().record(revokeAccess, LogLevel::debug, "Client %@ does not have an exiting ClientAuthorization. Ignoring...", "client",
                 client);
    return;
  }

  const Value* appID = storedAppID(*record);
  log().record(revokeAccess, LogLevel::debug, foundAppID, "appID, client", appID, client);
  if (const std::string* tokenHolder = usableAppID(appID)) {
    log().record(revokeAccess, LogLevel::debug, invalidatingToken, "client", client);
    social().makeFacebookSession()->revokeAccessTokenForAppWithID(*tokenHolder);
    log().record(revokeAccess, LogLevel::debug, removingCredential, "client", client);
    keychain().removeCredentialForAccount(account, client->bundleID());
  }

  record->setIsGranted(false);
  record->setGrantedPermissions(nullptr);
  authorizations.setAuthorization(*record, client, accountType);
  _logStoredRecord(revokeAccess, accountType, *client, *record);
}

void VXFacebookAccountAccessPlugin::revokeAllAccessToAccountsOfType(std::shared_ptr<const AccountType> accountType,
                                                                    std::shared_ptr<AccountStore> store,
                                                                    AccessCompletion withCompletion) {
  const auto revokeAll = [&](const AccessCompletion& answer) {
    const auto account = _accountOfType(accountType, *store);
    if (account == nullptr) {
      log().record(revokeAllAccess, LogLevel::error, "No Facebook account. What?", "");
      answer(true, std::nullopt);
      return;
    }

    AuthorizationManager& authorizations = store->authorizationManager();
    const auto records = authorizations.allAuthorizationsForAccountType(*accountType);
    log().record(revokeAllAccess, LogLevel::debug, "Found %d authorized clients. Revoking all...", "clientAuthorizations.count",
                 records.size());

    const auto session = social().makeFacebookSession();
    for (const auto& record : records) {
      const std::shared_ptr<const Client>& client = record->client();
      const Value* appID = storedAppID(*record);
      log().record(revokeAllAccess, LogLevel::debug, foundAppID, "appID, client", appID, client);
      const std::string* tokenHolder = usableAppID(appID);
      if (tokenHolder == nullptr) continue;

      const std::optional<std::string> bundleID = client->bundleID();
      log().record(revokeAllAccess, LogLevel::debug, invalidatingToken, "client", client);
      session->revokeAccessTokenForAppWithID(*tokenHolder);
      log().record(revokeAllAccess, LogLevel::debug, removingCredential, "client.bundleID", bundleID);
      keychain().removeCredentialForAccount(account, bundleID);
    }
    authorizations.removeAllClientAuthorizationsForAccountType(*accountType);
    answer(true, std::nullopt);
  };
  answerExactlyOnce(std::move(withCompletion), log(), revokeAllAccess, std::ref(revokeAll));
}

}  // namespace palisade
