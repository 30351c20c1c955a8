// Direct authorization: the daemon grants a client access without asking the user.
//
// A record with an app ID gets a fresh token first, and the calling thread waits for it. The daemon has decided already, so a
// server that refuses or cannot be reached still leads to a grant, with whatever it delivered, whatever error it names. Only
// what is thrown before the record is stored ends without one.

#include "Facebook/Palisade/AwaitedAnswer.h"
#include "Facebook/Palisade/ExactlyOnce.h"
#include "Facebook/Palisade/PermissionSetAlgebra.h"
#include "Facebook/Palisade/StoredAppID.h"
#include "Facebook/Palisade/VXFacebookAccountAccessPlugin.h"
#include "Platform/AccountStore.h"
#include "Platform/AccountType.h"
#include "Platform/AuthorizationManager.h"
#include "Platform/Client.h"

namespace palisade {
namespace {

constexpr const char* authorizeAccess = "authorizeAccessToAccountsOfType:forClient:store:completion:";

}  // namespace

void VXFacebookAccountAccessPlugin::authorizeAccessToAccountsOfType(std::shared_ptr<const AccountType> accountType,
                                                                    std::shared_ptr<const Client> forClient,
                                                                    std::shared_ptr<AccountStore> store,
                                                                    AccessCompletion completion) {
  const auto authorize = [&](const AccessCompletion& answer) {
    const auto account = _accountOfType(accountType, *store);
    if (account == nullptr) {
      answer(false, std::nullopt);
      return;
    }

    AuthorizationManager& authorizations = store->authorizationManager();
    PermissionSetRef grantedPermissions;
    auto record = authorizations.authorizationForClient(forClient, *accountType);
    if (record != nullptr) {
      if (const std::string* appID = usableAppID(storedAppID(*record))) {
        grantedPermissions = _permissionsGrantedByServer(forClient, *appID, account);
      }
    } else {
      log().record(authorizeAccess, LogLevel::debug,
                   "This is strange behavior. We're being asked to directly authorize %@ for Facebook access.", "client",
                   forClient);
      record = std::make_shared<ClientAuthorization>(forClient);
    }

    record->setIsGranted(true);
    record->setGrantedPermissions(grantedPermissions);
    const std::optional<Error> error = authorizations.setAuthorization(*record, forClient, *accountType);
    _logStoredRecord(authorizeAccess, *accountType, *forClient, *record);
    answer(!error.has_value(), error);
  };
  answerExactlyOnce(std::move(completion), log(), authorizeAccess, std::ref(authorize));
}

PermissionSetRef VXFacebookAccountAccessPlugin::_permissionsGrantedByServer(const std::shared_ptr<const Client>& client,
                                                                            const std::string& appID,
                                                                            const std::shared_ptr<Account>& account) const {
  auto granted = std::make_shared<AwaitedAnswer<PermissionSetRef>>();
  auto answer = granted->future();
  auto fail = [granted](const std::exception_ptr& failure) { granted->fail(failure); };
  _exchangeWithServer(
      client, appID, nullptr, std::nullopt, account,
      [granted = std::move(granted)](bool, const std::optional<Array>& permissions, const std::optional<Error>&) {
        granted->bring(
            std::make_shared<const PermissionSet>(permissions ? permissionSetFromArray(*permissions) : PermissionSet()));
      },
      std::move(fail));
  return answer.get();
}

}  // namespace palisade
