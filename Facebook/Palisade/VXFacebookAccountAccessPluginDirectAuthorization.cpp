// Direct authorization: the daemon grants a client access without asking the user.
//
// A record with an app ID gets a fresh token first, and the calling thread waits for it. The daemon has decided already, so a
// server that refuses or cannot be reached still leads to a grant, with whatever it delivered; only a failure of the plug-in or
// of a service ends without one.

#include <future>

#include "Facebook/Palisade/ExactlyOnce.h"
#include "Facebook/Palisade/PermissionSetAlgebra.h"
#include "Facebook/Palisade/StoredAppID.h"
#include "Facebook/Palisade/VXFacebookAccountAccessPlugin.h"
#include "Platform/AccountStore.h"
#include "Platform/AccountType.h"
#include "Platform/AuthorizationManager.h"
#include "Platform/Client.h"
#include "Platform/Format.h"

namespace palisade {
namespace {

constexpr const char* authorizeAccess = "authorizeAccessToAccountsOfType:forClient:store:completion:";

}  // namespace

void VXFacebookAccountAccessPlugin::authorizeAccessToAccountsOfType(std::shared_ptr<const AccountType> accountType,
                                                                    std::shared_ptr<const Client> forClient,
                                                                    std::shared_ptr<AccountStore> store,
                                                                    AccessCompletion completion) {
  _runOperation(authorizeAccess, std::move(completion), [&](const AccessCompletion& answer) {
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
    log().logAccessRequest({.accountTypeIdentifier = accountType->identifier(),
                            .bundleID = forClient->bundleID(),
                            .granted = record->isGranted(),
                            .userPrompted = false,
                            .elapsedSeconds = 0.0});
    answer(!error.has_value(), error);
  });
}

PermissionSetRef VXFacebookAccountAccessPlugin::_permissionsGrantedByServer(const std::shared_ptr<const Client>& client,
                                                                            const std::string& appID,
                                                                            const std::shared_ptr<Account>& account) const {
  auto granted = std::make_shared<std::promise<PermissionSetRef>>();
  auto answer = granted->get_future();
  // Only the callback holds the promise: if it is dropped uncalled, the wait ends with an exception.
  _getServerAuthorizationForClient(
      client, appID, nullptr, std::nullopt, account,
      [granted = std::move(granted)](bool, const std::optional<Array>& permissions, const std::optional<Error>& error) {
        if (isUnexpectedFailure(error)) {
          granted->set_exception(std::make_exception_ptr(std::runtime_error(error->description.value_or(describe(*error)))));
        } else {
          granted->set_value(
              std::make_shared<const PermissionSet>(permissions ? permissionSetFromArray(*permissions) : PermissionSet()));
        }
      });
  return answer.get();
}

}  // namespace palisade
