#pragma once

/// Decides whether a client application may use the user's Facebook account, with which permissions and for which audience.
///
/// One object serves any number of requests. It checks the client's entitlements, validates the options, compares them with the
/// earlier grant, asks the user in a modal alert, has the Facebook server issue a token for the client's app, stores the token
/// in the keychain and records the grant. It also revokes grants and authorizes clients directly.
///
/// Threads: every operation may be called on any thread, several at a time; requests share nothing but the catalogue sets. The
/// calling thread is blocked by the alert, by the description of unknown permissions and by direct authorization, each without
/// a time-out. The completion of a grant that needs the server runs on the thread that brings the server's answer; all other
/// completions run on the calling thread before the operation returns.
/// Ownership: made by the module's entry point and shared; a pending callback keeps the object alive.
/// Errors: only completions carry errors. Missing data is answered with empty results inside the plug-in. A service that throws
/// ends the operation with (false, `AccountsErrorUnexpectedFailure`): never with a grant, and never without an answer. So does
/// memory that runs out. Once a record is stored, the answer is what was stored, whatever throws then.
///
/// Operations with a leading underscore are the object's own. Contents, in the order of the sibling files:
///   1 Access requests        VXFacebookAccountAccessPlugin.cpp
///   2 Preference             VXFacebookAccountAccessPluginPreference.cpp
///   3 Options                VXFacebookAccountAccessPluginOptions.cpp
///   4 Permission catalogue   VXFacebookAccountAccessPluginCatalogue.cpp
///   5 Phrasing               VXFacebookAccountAccessPluginPhrasing.cpp
///   6 Consent message        VXFacebookAccountAccessPluginConsentMessage.cpp
///   7 Unknown permissions    VXFacebookAccountAccessPluginUnknownPermissions.cpp
///   8 Prompt                 VXFacebookAccountAccessPluginPrompt.cpp
///   9 User response          VXFacebookAccountAccessPluginUserResponse.cpp
///  10 Server authorization   VXFacebookAccountAccessPluginServerAuthorization.cpp
///  11 Credential             VXFacebookAccountAccessPluginCredential.cpp
///  12 Direct authorization   VXFacebookAccountAccessPluginDirectAuthorization.cpp
///  13 Revocation             VXFacebookAccountAccessPluginRevocation.cpp
/// The module's entry point is in VXFacebookAccountAccessPluginModule.cpp.

#include <exception>
#include <functional>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <string_view>

#include "Facebook/Palisade/PermissionCatalogueSets.h"
#include "Platform/AccountAccessPlugin.h"
#include "Platform/ClientAuthorization.h"
#include "Platform/Log.h"
#include "Platform/PermissionSet.h"
#include "Platform/SystemAlert.h"
#include "Platform/Value.h"

namespace palisade {

class Account;
class AuthorizationManager;

/// The user's answer to the consent prompt, whether the server is to be left out, and the permissions asked for (or none).
using PromptCompletion = std::function<void(bool granted, bool skipServer, const PermissionSetRef& permissions)>;

/// True exactly when the user pressed the allow button.
using AlertCompletion = std::function<void(bool granted)>;

/// The raw answer of the alert service; the handle is valid while the callback runs.
using NotificationCompletion = std::function<void(const std::shared_ptr<AlertHandle>& handle, AlertResponse response)>;

/// Whether the server issued a token, the permissions that the token carries (or none), the error (or none).
using ServerAuthorizationCompletion =
    std::function<void(bool granted, const std::optional<Array>& permissions, const std::optional<Error>& error)>;

/// Localised names of the objects behind permissions: each text once, in the order of their bytes.
using ObjectNames = std::set<std::string>;

class VXFacebookAccountAccessPlugin : public AccountAccessPlugin {
 public:
  static bool supportsAccountTypeWithIdentifier(std::string_view identifier);

  /// Throws `std::invalid_argument` when the base class refuses the services.
  explicit VXFacebookAccountAccessPlugin(const PlatformServices& services);

  /// `allowUserInteraction` is not read: a request that needs the user's consent asks for it even when the flag is false.
  void handleAccessRequestToAccountsOfType(std::shared_ptr<const AccountType> accountType,
                                           std::shared_ptr<const Client> forClient,
                                           std::shared_ptr<const Dictionary> withOptions, std::shared_ptr<AccountStore> store,
                                           bool allowUserInteraction, AccessCompletion completion) override;

  void authorizeAccessToAccountsOfType(std::shared_ptr<const AccountType> accountType, std::shared_ptr<const Client> forClient,
                                       std::shared_ptr<AccountStore> store, AccessCompletion completion) override;

  void revokeAccessToAccountsOfType(std::shared_ptr<const AccountType> accountType, std::shared_ptr<const Client> forClient,
                                    std::shared_ptr<AccountStore> store, AccessCompletion completion) override;

  void revokeAllAccessToAccountsOfType(std::shared_ptr<const AccountType> accountType, std::shared_ptr<AccountStore> store,
                                       AccessCompletion withCompletion) override;

 protected:
  // 1 Access requests

  /// The first Facebook account of the store, with its account type set, or none. Further accounts are ignored.
  std::shared_ptr<Account> _accountOfType(const std::shared_ptr<const AccountType>& accountType, AccountStore& withStore) const;

  // 2 Preference

  /// The user preference `FacebookIgnoreAccessRequests`; an absent value is false.
  bool _shouldIgnoreAccessRequest() const;

  // 3 Options. A null dictionary is "none" and reads as one without entries.

  std::optional<std::string> _appIDFromOptionsDictionary(const Dictionary* options) const;
  PermissionSet _permissionsFromOptionsDictionary(const Dictionary* options) const;
  std::optional<std::string> _audienceFromOptionsDictionary(const Dictionary* options) const;
  bool _validateOptionsDictionary(const Dictionary* options) const;

  /// What a grant keeps of the options: app ID and audience, as they stand.
  std::shared_ptr<const Dictionary> _persistentDictionaryForOptions(const Dictionary* options) const;

  /// The elements joined by ",", in the set's own order; empty for the empty set and for none.
  std::string _csvStringFromSet(const PermissionSet* set) const;

  // 4 Permission catalogue. The cached sets live as long as the object and never change.

  const PermissionSet& _basicReadPermissions() const;
  const PermissionSet& _extendedReadPermissions() const;
  const PermissionSet& _writePermissions() const;
  const PermissionSet& _managePermissions() const;
  /// A new set that the caller owns: extended read and basic read together.
  PermissionSet _allReadPermissions() const;
  /// A new set of the names that describe the user's own profile in detail.
  PermissionSet _userProfileReadPermissions() const;
  /// The cached set of a category, or none when there is no such category.
  const PermissionSet* _allPermissionsInCategory(std::optional<std::string_view> category) const;

  // 5 Phrasing

  /// The localised phrase for the permissions of one category, or none.
  std::optional<std::string> _predicateForPermissions(const PermissionSet& permissions, std::string_view ofCategory,
                                                      const std::optional<std::string>& audience) const;
  std::optional<std::string> _userObjectsRequestedByPermissions(const PermissionSet& permissions) const;
  std::optional<std::string> _friendObjectsRequestedByPermissions(const PermissionSet& permissions) const;
  /// The names as a list, in one text; a list of no names has empty places.
  std::string _commaSeparatedListWithFormat(std::string_view formatKey, const ObjectNames& forObjectNames) const;
  std::string _objectNameForReadPermission(std::string_view permission) const;
  std::string _objectNameForManagePermission(std::string_view permission) const;
  std::string _userFriendlyAudienceString(const std::optional<std::string>& audience) const;
  /// A text of the table "Localizable"; the empty string when the table has none.
  std::string _localizedString(std::string_view key) const;

  // 6 Consent message

  /// One sentence that says which app asks and what it wants to do, or none when no sentence can be made.
  std::optional<std::string> _constructUserMessageForPermissions(const PermissionSet& permissions,
                                                                 const std::optional<std::string>& audience,
                                                                 const std::string& appName,
                                                                 const std::shared_ptr<Account>& account) const;

  // 7 Unknown permissions. Both wait for the server.

  std::optional<std::string> _appendDescriptionOfUnknownPermissions(const PermissionSetRef& unknownPermissions,
                                                                    const std::optional<std::string>& toUserMessage,
                                                                    const std::string& forAppWithName,
                                                                    const std::optional<std::string>& audience,
                                                                    const std::shared_ptr<Account>& account) const;
  std::optional<std::string> _fetchDescriptionForUnknownPermissions(const PermissionSetRef& permissions,
                                                                    const std::optional<std::string>& audience,
                                                                    const std::shared_ptr<Account>& account) const;

  // 8 Prompt. Each waits for the user and returns after its completion has run.

  void _promptUserToApproveRequestForPermissions(const PermissionSetRef& permissions,
                                                 const std::optional<std::string>& withAudience,
                                                 const std::shared_ptr<const Client>& fromClient,
                                                 const std::shared_ptr<Account>& account,
                                                 const PromptCompletion& completion) const;
  void _showAlertWithMessage(const std::string& message, const AlertCompletion& completion) const;
  void _showUserNotificationWithTitle(const std::string& title, const std::string& message,
                                      const std::string& defaultButtonTitle, const std::string& alternateButtonTitle,
                                      const NotificationCompletion& withCompletionBlock) const;

  // 9 User response

  /// Ends an access request with the user's answer. `isFirstTimeRequest` is true exactly when the client already holds a
  /// granted record, the reverse of what its name says: the refusal of further permissions then keeps the earlier grant.
  void _handleUserResponse(bool response, const std::shared_ptr<const Client>& toRequestForClient, const std::string& withAppID,
                           const std::shared_ptr<const Dictionary>& persistentOptions,
                           const std::shared_ptr<Account>& onAccount, const std::shared_ptr<const AccountType>& ofType,
                           const PermissionSet& existingPermissions, const PermissionSetRef& newPermissions,
                           const std::optional<std::string>& audience, bool isFirstTimeRequest, bool shouldSkipServer,
                           const std::shared_ptr<AccountStore>& store, const AccessCompletion& completion) const;

  // 10 Server authorization

  /// Asks the server for a token for the client's app and stores it. The completion runs once: at once when the client has no
  /// bundle ID, otherwise on the thread that brings the server's answer.
  void _getServerAuthorizationForClient(const std::shared_ptr<const Client>& client, const std::string& withAppID,
                                        const PermissionSetRef& permissions, const std::optional<std::string>& audience,
                                        const std::shared_ptr<Account>& account,
                                        ServerAuthorizationCompletion completion) const;
  /// The server's word for an audience, or none when it has none.
  std::optional<std::string> _serverAudienceStringForAudience(const std::optional<std::string>& audience) const;
  /// The token of the account's own credential, which signs requests to the server, or none.
  std::optional<std::string> _masterTokenForAccount(const std::shared_ptr<Account>& account) const;

  // 11 Credential

  /// Keeps the client's token in the keychain; without a token it does nothing.
  void _saveCredentialForClient(const std::shared_ptr<const Client>& client, const std::shared_ptr<Account>& onAccount,
                                const std::optional<std::string>& usingAccessToken) const;

 private:
  void _decideAccessRequest(const std::shared_ptr<const AccountType>& accountType, const std::shared_ptr<const Client>& client,
                            const Dictionary* options, const std::shared_ptr<AccountStore>& store,
                            const AccessCompletion& completion) const;
  PermissionSet _permissionsHeldThrough(const ClientAuthorization& record, const std::string& appID,
                                        const std::optional<std::string>& audience,
                                        const PermissionSet& requestedPermissions) const;

  /// Writes the access-request record of a changed record that is in the store. A failure is logged and changes nothing.
  void _logStoredRecord(LogPlace operation, const AccountType& accountType, const Client& client,
                        const ClientAuthorization& record) const noexcept;

  using ExchangeFailure = std::function<void(const std::exception_ptr& failure)>;

  /// The exchange behind `_getServerAuthorizationForClient`. What the plug-in or a service throws while the answer is dealt
  /// with goes to `fail`, so that nobody takes it for an error that the framework delivered.
  void _exchangeWithServer(const std::shared_ptr<const Client>& client, const std::string& appID,
                           const PermissionSetRef& permissions, const std::optional<std::string>& audience,
                           const std::shared_ptr<Account>& account, ServerAuthorizationCompletion completion,
                           ExchangeFailure fail) const;
  void _handleAuthorizationAnswer(const std::optional<std::string>& data, const std::optional<Error>& error,
                                  const std::shared_ptr<const Client>& client, const std::shared_ptr<Account>& account,
                                  const ServerAuthorizationCompletion& completion) const;
  std::optional<std::string> _descriptionFromAnswer(const std::optional<std::string>& data, const std::optional<Error>& error,
                                                    const PermissionSetRef& permissions) const;
  PermissionSetRef _permissionsGrantedByServer(const std::shared_ptr<const Client>& client, const std::string& appID,
                                               const std::shared_ptr<Account>& account) const;
  void _revokeAccess(const AccountType& accountType, const std::shared_ptr<const Client>& client,
                     const std::shared_ptr<Account>& account, AuthorizationManager& authorizations) const;

  /// The only members; filled on first use, whatever thread comes first.
  mutable PermissionCatalogueSets _sets;
};

}  // namespace palisade
