// The exchange with the Facebook server that gets a client its token.
//
// The request is signed with the account's own token, the master token; without one it is sent all the same, and the server
// refuses it. The answer arrives on a thread of the social framework's choosing; there the token is stored before anybody is
// told of the grant. A server that answers something else than an object answers no token.

#include "Facebook/Palisade/ExactlyOnce.h"
#include "Facebook/Palisade/VXFacebookAccountAccessPlugin.h"
#include "Platform/AccountConstants.h"
#include "Platform/Client.h"
#include "Platform/Format.h"
#include "Platform/JsonParser.h"
#include "Platform/KeychainManager.h"
#include "Platform/SocialFramework.h"

namespace palisade {
namespace {

constexpr const char* getServerAuthorization =
    "_getServerAuthorizationForClient:withAppID:permissions:audience:account:completion:";

Error describedError(AccountsErrorCode code, std::string description) {
  return {.domain = std::string(AccountsErrorDomain), .code = code, .description = std::move(description)};
}

const Value* member(const Value& answer, std::string_view name) {
  return answer.dictionary() == nullptr ? nullptr : answer.dictionary()->find(name);
}

// A null that was sent says as little as a member that was left out.
std::string reasonForPeople(const Value* reason) {
  return reason == nullptr || reason->isNull() ? std::string(NoneRendering) : describe(*reason);
}

}  // namespace

std::optional<std::string> VXFacebookAccountAccessPlugin::_serverAudienceStringForAudience(
    const std::optional<std::string>& audience) const {
  if (audience == FacebookAudienceEveryone) return "EVERYONE";
  if (audience == FacebookAudienceFriends) return "ALL_FRIENDS";
  if (audience == FacebookAudienceOnlyMe) return "SELF";
  return std::nullopt;
}

std::optional<std::string> VXFacebookAccountAccessPlugin::_masterTokenForAccount(
    const std::shared_ptr<Account>& account) const {
  const auto credential = keychain().credentialForAccount(account, std::nullopt);
  return credential == nullptr ? std::nullopt : credential->oauthToken();
}

void VXFacebookAccountAccessPlugin::_getServerAuthorizationForClient(const std::shared_ptr<const Client>& client,
                                                                     const std::string& withAppID,
                                                                     const PermissionSetRef& permissions,
                                                                     const std::optional<std::string>& audience,
                                                                     const std::shared_ptr<Account>& account,
                                                                     ServerAuthorizationCompletion completion) const {
  auto fail = [completion](const std::exception_ptr& failure) {
    completion(false, std::nullopt, UnexpectedFailure(failure).error());
  };
  _exchangeWithServer(client, withAppID, permissions, audience, account, std::move(completion), std::move(fail));
}

void VXFacebookAccountAccessPlugin::_exchangeWithServer(const std::shared_ptr<const Client>& client, const std::string& appID,
                                                        const PermissionSetRef& permissions,
                                                        const std::optional<std::string>& audience,
                                                        const std::shared_ptr<Account>& account,
                                                        ServerAuthorizationCompletion completion, ExchangeFailure fail) const {
  const std::optional<std::string> bundleID = client->bundleID();
  if (!bundleID) {
    completion(false, std::nullopt,
               describedError(AccountsErrorNoBundleID,
                              formatText("Cannot obtain server authorization for client %@ because it has no bundle ID.",
                                         {client->description()})));
    return;
  }

  const auto request =
      social().makeFacebookAuthorizationRequest(appID, *bundleID, permissions, _serverAudienceStringForAudience(audience));
  const std::optional<std::string> masterToken = _masterTokenForAccount(account);
  if (!masterToken || masterToken->empty()) {
    log().record(getServerAuthorization, LogLevel::error,
                 "Could not get the master token for account %@ to sign the access request.", "account", account);
  }
  request->setAccessToken(masterToken);

  // Only the handler holds the completion: if the framework drops the handler, the daemon is answered with a refusal.
  request->performRequestWithHandler(takeFirstAnswer(
      [this, keepAlive = shared_from_this(), client, account, completion = std::move(completion)](
          const std::optional<std::string>& data, const std::optional<HttpResponse>&, const std::optional<Error>& error) {
        _handleAuthorizationAnswer(data, error, client, account, completion);
      },
      std::move(fail), log(), getServerAuthorization));
}

void VXFacebookAccountAccessPlugin::_handleAuthorizationAnswer(const std::optional<std::string>& data,
                                                               const std::optional<Error>& error,
                                                               const std::shared_ptr<const Client>& client,
                                                               const std::shared_ptr<Account>& account,
                                                               const ServerAuthorizationCompletion& completion) const {
  if (!data || error) {
    log().record(getServerAuthorization, LogLevel::error, "Error contacting Facebook server for access authorization: %@",
                 "error", error);
    completion(false, std::nullopt, error);
    return;
  }
  const JsonParseResult parsed = json().parse(*data, JsonFragments::allowed);
  if (!parsed.value || parsed.error) {
    log().record(getServerAuthorization, LogLevel::error, "VXFacebookAccountAccessPlugin could not parse server response: %@.",
                 "error", parsed.error);
    completion(false, std::nullopt, parsed.error);
    return;
  }
  const Value& answer = *parsed.value;
  log().record(getServerAuthorization, LogLevel::debug, "Access request response: %@", "response", answer);

  const Value* token = member(answer, "access_token");
  if (token == nullptr || token->string() == nullptr) {
    const Value* reason = member(answer, "error_msg");
    completion(
        false, std::nullopt,
        describedError(AccountsErrorAccessDenied,
                       formatText("The Facebook server could not fulfill this access request: %@", {reasonForPeople(reason)})));
    return;
  }
  _saveCredentialForClient(client, account, *token->string());

  const Value* permissions = member(answer, "permissions");
  const bool hasPermissions = permissions != nullptr && permissions->array() != nullptr;
  completion(true, hasPermissions ? std::optional(*permissions->array()) : std::nullopt, std::nullopt);
}

}  // namespace palisade
