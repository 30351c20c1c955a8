// The end of an access request: the user's answer becomes a record and the daemon's completion.
//
// The preference to ignore requests overrides everything, an approval included. A refusal is written down only for a client
// that holds no grant, so that refusing an extension keeps what was granted before. An approval is recorded with what the
// server grants; a failed exchange with the server records nothing.

#include "Facebook/Palisade/PermissionSetAlgebra.h"
#include "Facebook/Palisade/VXFacebookAccountAccessPlugin.h"
#include "Platform/AccountConstants.h"
#include "Platform/AccountStore.h"
#include "Platform/AuthorizationManager.h"

namespace palisade {
namespace {

constexpr const char* handleUserResponse =
    "_handleUserResponse:toRequestForClient:withAppID:persistentOptions:onAccount:ofType:existingPermissions:newPermissions:"
    "audience:isFirstTimeRequest:shouldSkipServer:store:completion:";

Array arrayOfUnion(const PermissionSet& existingPermissions, const PermissionSetRef& newPermissions) {
  PermissionSet all = existingPermissions;
  if (newPermissions != nullptr) all.insert(newPermissions->begin(), newPermissions->end());
  return {all.begin(), all.end()};
}

}  // namespace

void VXFacebookAccountAccessPlugin::_handleUserResponse(
    bool response, const std::shared_ptr<const Client>& toRequestForClient, const std::string& withAppID,
    const std::shared_ptr<const Dictionary>& persistentOptions, const std::shared_ptr<Account>& onAccount,
    const std::shared_ptr<const AccountType>& ofType, const PermissionSet& existingPermissions,
    const PermissionSetRef& newPermissions, const std::optional<std::string>& audience, bool isFirstTimeRequest,
    bool shouldSkipServer, const std::shared_ptr<AccountStore>& store, const AccessCompletion& completion) const {
  if (_shouldIgnoreAccessRequest()) {
    log().record(handleUserResponse, LogLevel::notice,
                 "Will not contact server about this access request due to user-set pref.", "");
    completion(false, std::nullopt);
    return;
  }

  const auto record = std::make_shared<ClientAuthorization>(toRequestForClient);
  record->setOptions(persistentOptions);

  if (!response) {
    if (!isFirstTimeRequest) {
      record->setIsGranted(false);
      record->setGrantedPermissions(nullptr);
      store->authorizationManager().setAuthorization(*record, toRequestForClient, *ofType);
    }
    completion(false, Error{.domain = std::string(AccountsErrorDomain), .code = AccountsErrorAccessDenied});
    return;
  }

  ServerAuthorizationCompletion recordGrant = [record, store, client = toRequestForClient, accountType = ofType, completion](
                                                  bool granted, const std::optional<Array>& permissions,
                                                  const std::optional<Error>& error) {
    if (granted) {
      record->setIsGranted(true);
      record->setGrantedPermissions(
          std::make_shared<const PermissionSet>(permissions ? permissionSetFromArray(*permissions) : PermissionSet()));
      store->authorizationManager().setAuthorization(*record, client, *accountType);
    }
    completion(granted, error);
  };

  if (shouldSkipServer) {
    log().record(handleUserResponse, LogLevel::notice, "Skipping server request!", "");
    recordGrant(true, arrayOfUnion(existingPermissions, newPermissions), std::nullopt);
  } else {
    _getServerAuthorizationForClient(toRequestForClient, withAppID, newPermissions, audience, onAccount,
                                     std::move(recordGrant));
  }
}

}  // namespace palisade
