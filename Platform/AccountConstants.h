#pragma once

/// The names that the account daemon, its clients and its plug-ins share. Written once, here.
///
/// Option keys and audience values travel over D-Bus and stand in stored grants; they never change their value.

#include <string_view>

namespace palisade {

/// Identifies the Facebook account type.
inline constexpr std::string_view AccountTypeIdentifierFacebook = "com.veltran.accounttype.facebook";

/// Entitlements of client applications. The first grants every account without a question, the second grants Facebook without
/// asking the user.
inline constexpr std::string_view AllAccountsAccessEntitlement = "com.veltran.accounts.all-access";
inline constexpr std::string_view FacebookDefaultAccessEntitlement = "com.veltran.accounts.facebook.default-access";

/// Keys of the options that a client passes with a request. A grant keeps the first and the last of them.
inline constexpr std::string_view FacebookAppIdKey = "FacebookAppIdKey";              ///< string, not empty; always required
inline constexpr std::string_view FacebookPermissionsKey = "FacebookPermissionsKey";  ///< array of permission names
inline constexpr std::string_view FacebookAudienceKey = "FacebookAudienceKey";        ///< string; required to publish

/// Values under `FacebookAudienceKey`: who may see what the client's app posts.
inline constexpr std::string_view FacebookAudienceEveryone = "FacebookAudienceEveryone";
inline constexpr std::string_view FacebookAudienceFriends = "FacebookAudienceFriends";
inline constexpr std::string_view FacebookAudienceOnlyMe = "FacebookAudienceOnlyMe";

/// The domain of the errors that the account daemon and its plug-ins make.
inline constexpr std::string_view AccountsErrorDomain = "AccountsErrorDomain";

/// Codes in `AccountsErrorDomain`.
enum AccountsErrorCode : int {
  AccountsErrorAccountNotFound = 6,    ///< there is no account of the type, and the client has no default access
  AccountsErrorAccessDenied = 7,       ///< the user refused, or the server issued no token (then with a description)
  AccountsErrorInvalidOptions = 8,     ///< the options dictionary lacks a value or holds one of the wrong type
  AccountsErrorNoBundleID = 16,        ///< the client has no bundle ID to request a token for (with a description)
  AccountsErrorUnexpectedFailure = 99  ///< a service or a plug-in failed where it must not (with a description); never a grant
};

/// The user preference that makes the Facebook plug-in leave requests alone, its domain, and the notification after which the
/// domain has to be read again.
inline constexpr std::string_view FacebookPreferencesAppID = "com.veltran.social.facebook";
inline constexpr std::string_view FacebookIgnoreAccessRequests = "FacebookIgnoreAccessRequests";
inline constexpr std::string_view FacebookEnvironmentDidChangeNotification = "FacebookEnvironmentDidChangeNotification";

}  // namespace palisade
