// Access requests: the road from the daemon's call to the consent prompt.
//
// The flow answers at once whatever needs no consent: entitlements, a missing account, invalid options, a refused record, an
// earlier grant that covers the request. Only what is new goes to the prompt, and the prompt's answer goes to the user-response
// handler together with everything gathered here. The flow reads the client's record and never writes it.

#include "Facebook/Palisade/VXFacebookAccountAccessPlugin.h"

#include "Facebook/Palisade/ExactlyOnce.h"
#include "Facebook/Palisade/PermissionSetAlgebra.h"
#include "Facebook/Palisade/VXFacebookPermissionCategories.h"
#include "Platform/Account.h"
#include "Platform/AccountConstants.h"
#include "Platform/AccountStore.h"
#include "Platform/AccountType.h"
#include "Platform/AuthorizationManager.h"
#include "Platform/Client.h"

namespace palisade {
namespace {

constexpr const char* handleAccessRequest =
    "handleAccessRequestToAccountsOfType:forClient:withOptions:store:allowUserInteraction:completion:";

Error refusal(AccountsErrorCode code) { return {.domain = std::string(AccountsErrorDomain), .code = code}; }

}  // namespace

bool VXFacebookAccountAccessPlugin::supportsAccountTypeWithIdentifier(std::string_view identifier) {
  return identifier == AccountTypeIdentifierFacebook;
}

VXFacebookAccountAccessPlugin::VXFacebookAccountAccessPlugin(const PlatformServices& services) : AccountAccessPlugin(services) {
  prepareForFailures();
  _sets._permissionCategories = std::make_shared<const PermissionSet>(
      PermissionSet{VXFacebookPermissionCategoryBasicRead, VXFacebookPermissionCategoryExtendedRead,
                    VXFacebookPermissionCategoryWrite, VXFacebookPermissionCategoryManage});
}

void VXFacebookAccountAccessPlugin::_logStoredRecord(LogPlace operation, const AccountType& accountType, const Client& client,
                                                     const ClientAuthorization& record) const noexcept {
  try {
    log().logAccessRequest({.accountTypeIdentifier = accountType.identifier(),
                            .bundleID = client.bundleID(),
                            .granted = record.isGranted(),
                            .userPrompted = false,
                            .elapsedSeconds = 0.0});
  } catch (...) {
    logUnexpectedFailure(log(), operation, std::current_exception());
  }
}

void VXFacebookAccountAccessPlugin::handleAccessRequestToAccountsOfType(std::shared_ptr<const AccountType> accountType,
                                                                        std::shared_ptr<const Client> forClient,
                                                                        std::shared_ptr<const Dictionary> withOptions,
                                                                        std::shared_ptr<AccountStore> store,
                                                                        bool /*allowUserInteraction*/,
                                                                        AccessCompletion completion) {
  const auto decide = [&](const AccessCompletion& answer) {
    _decideAccessRequest(accountType, forClient, withOptions.get(), store, answer);
  };
  answerExactlyOnce(std::move(completion), log(), handleAccessRequest, std::ref(decide));
}

void VXFacebookAccountAccessPlugin::_decideAccessRequest(const std::shared_ptr<const AccountType>& accountType,
                                                         const std::shared_ptr<const Client>& client, const Dictionary* options,
                                                         const std::shared_ptr<AccountStore>& store,
                                                         const AccessCompletion& completion) const {
  log().record(handleAccessRequest, LogLevel::debug, "Palisade is handling request for access from %@.", "client", client);
  if (client->hasEntitlement(AllAccountsAccessEntitlement)) {
    completion(true, std::nullopt);
    return;
  }

  const bool hasDefaultAccess = client->hasEntitlement(FacebookDefaultAccessEntitlement);
  if (hasDefaultAccess) log().record(handleAccessRequest, LogLevel::debug, "Granting default access to %@.", "client", client);

  const std::shared_ptr<Account> account = _accountOfType(accountType, *store);
  if (!hasDefaultAccess && account == nullptr) {
    log().record(handleAccessRequest, LogLevel::error, "No Facebook accounts. Rejecting access request.", "");
    completion(false, refusal(AccountsErrorAccountNotFound));
    return;
  }
  if (!_validateOptionsDictionary(options)) {
    log().record(handleAccessRequest, LogLevel::error, "%@ provided an invalid options dictionary.", "client", client);
    completion(false, refusal(AccountsErrorInvalidOptions));
    return;
  }

  const std::optional<std::string> audience = _audienceFromOptionsDictionary(options);
  PermissionSet permissions = _permissionsFromOptionsDictionary(options);
  // Valid options hold an app ID.
  const std::string appID = _appIDFromOptionsDictionary(options).value();

  PermissionSet existingPermissions;
  const auto earlierRecord = store->authorizationManager().authorizationForClient(client, *accountType);
  const bool hadEarlierAuthorization = earlierRecord != nullptr;
  if (hadEarlierAuthorization) {
    // A client that was refused stays refused, whatever it asks for now.
    if (!earlierRecord->isGranted()) {
      completion(false, std::nullopt);
      return;
    }
    existingPermissions = _permissionsHeldThrough(*earlierRecord, appID, audience, permissions);
    // An empty grant covers nothing, not even a request for nothing: the user has not agreed to anything yet.
    if (!existingPermissions.empty() && isSubset(permissions, existingPermissions)) {
      completion(true, std::nullopt);
      return;
    }
  }

  subtract(permissions, existingPermissions);
  const auto newPermissions = std::make_shared<const PermissionSet>(std::move(permissions));

  const PromptCompletion consent = [this, keepAlive = shared_from_this(), client, accountType, account, store, completion,
                                    appID, audience, existingPermissions = std::move(existingPermissions),
                                    persistentOptions = _persistentDictionaryForOptions(options), hasDefaultAccess,
                                    hadEarlierAuthorization](bool granted, bool skipServer, const PermissionSetRef& asked) {
    if (!hasDefaultAccess) {
      // The user's time to answer is not part of the record: the daemon's readers expect 0.
      log().logAccessRequest({.accountTypeIdentifier = accountType->identifier(),
                              .bundleID = client->bundleID(),
                              .granted = granted,
                              .userPrompted = true,
                              .elapsedSeconds = 0.0});
    }
    _handleUserResponse(granted, client, appID, persistentOptions, account, accountType, existingPermissions, asked, audience,
                        hadEarlierAuthorization, skipServer, store, completion);
  };

  if (hasDefaultAccess) {
    consent(true, account == nullptr, newPermissions);
  } else {
    _promptUserToApproveRequestForPermissions(newPermissions, audience, client, account, consent);
  }
}

// What an earlier grant still covers. Permissions belong to the app that they were granted to. A grant to publish belongs to
// its audience too, so a request to publish for another audience has to be agreed to again.
PermissionSet VXFacebookAccountAccessPlugin::_permissionsHeldThrough(const ClientAuthorization& record,
                                                                     const std::string& appID,
                                                                     const std::optional<std::string>& audience,
                                                                     const PermissionSet& requestedPermissions) const {
  if (record.grantedPermissions() == nullptr) return {};
  const Dictionary* earlierOptions = record.options().get();
  if (_appIDFromOptionsDictionary(earlierOptions) != appID) return {};

  PermissionSet held = *record.grantedPermissions();
  // A valid request to publish names an audience, so an earlier grant without one differs.
  if (intersects(requestedPermissions, _writePermissions()) && _audienceFromOptionsDictionary(earlierOptions) != audience) {
    subtract(held, _writePermissions());
  }
  return held;
}

std::shared_ptr<Account> VXFacebookAccountAccessPlugin::_accountOfType(const std::shared_ptr<const AccountType>& accountType,
                                                                       AccountStore& withStore) const {
  const auto accounts = withStore.accountsWithAccountTypeIdentifier(accountType->identifier());
  if (accounts.empty()) return nullptr;
  accounts.front()->setAccountType(accountType);
  return accounts.front();
}

}  // namespace palisade
