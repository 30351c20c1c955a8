// Permissions that the catalogue does not know, described by the Facebook server.
//
// The calling thread waits for the server, with no time-out of its own: the transport ends what takes too long. Whatever is no
// description (an error, a body of another form, the server's own "cannot describe") takes the whole message away.

#include "Facebook/Palisade/AwaitedAnswer.h"
#include "Facebook/Palisade/ExactlyOnce.h"
#include "Facebook/Palisade/VXFacebookAccountAccessPlugin.h"
#include "Platform/Format.h"
#include "Platform/JsonParser.h"
#include "Platform/SocialFramework.h"

namespace palisade {
namespace {

constexpr const char* fetchDescription = "_fetchDescriptionForUnknownPermissions:audience:account:";

// The server's word for permissions that it cannot describe.
constexpr std::string_view cannotDescribe = "API_EC_PARAM";

}  // namespace

std::optional<std::string> VXFacebookAccountAccessPlugin::_appendDescriptionOfUnknownPermissions(
    const PermissionSetRef& unknownPermissions, const std::optional<std::string>& toUserMessage,
    const std::string& forAppWithName, const std::optional<std::string>& audience,
    const std::shared_ptr<Account>& account) const {
  const auto description = _fetchDescriptionForUnknownPermissions(unknownPermissions, audience, account);
  if (!description || description->empty()) return std::nullopt;
  if (!toUserMessage) return formatText(_localizedString("ACCOUNT_ACCESS_UNKNOWN_FORMAT"), {forAppWithName, *description});

  const std::string sentence = formatText(_localizedString("ACCOUNT_ACCESS_UNKNOWN_ADDITIONAL_FORMAT"), {*description});
  return *toUserMessage + formatText(" %@", {sentence});
}

std::optional<std::string> VXFacebookAccountAccessPlugin::_fetchDescriptionForUnknownPermissions(
    const PermissionSetRef& permissions, const std::optional<std::string>& audience,
    const std::shared_ptr<Account>& account) const {
  const auto request =
      social().makeFacebookPermissionDescriptionRequest(permissions, _serverAudienceStringForAudience(audience));
  request->setAccessToken(_masterTokenForAccount(account));

  auto description = std::make_shared<AwaitedAnswer<std::optional<std::string>>>();
  auto answer = description->future();
  auto fail = [description](const std::exception_ptr& failure) { description->fail(failure); };
  request->performRequestWithHandler(takeFirstAnswer(
      [this, keepAlive = shared_from_this(), permissions, description = std::move(description)](
          const std::optional<std::string>& data, const std::optional<HttpResponse>&, const std::optional<Error>& error) {
        description->bring(_descriptionFromAnswer(data, error, permissions));
      },
      std::move(fail), log(), fetchDescription));
  return answer.get();
}

std::optional<std::string> VXFacebookAccountAccessPlugin::_descriptionFromAnswer(const std::optional<std::string>& data,
                                                                                 const std::optional<Error>& error,
                                                                                 const PermissionSetRef& permissions) const {
  if (!data || error) {
    log().record(fetchDescription, LogLevel::error, "Error contacting Facebook server for permission description: %@", "error",
                 error);
    return std::nullopt;
  }
  const JsonParseResult parsed = json().parse(*data, JsonFragments::allowed);
  const std::string* description = parsed.value && !parsed.error ? parsed.value->string() : nullptr;
  if (description == nullptr) {
    log().record(fetchDescription, LogLevel::error, "Could not parse server response: %@.", "error", parsed.error);
    return std::nullopt;
  }
  log().record(fetchDescription, LogLevel::debug, "Server description for %@ was: %@", "permissions, description", permissions,
               *description);
  if (*description == cannotDescribe) return std::nullopt;
  return *description;
}

}  // namespace palisade
