#include "Tools/PluginReplay/ConstantNames.h"

#include <algorithm>

#include "Platform/AccountConstants.h"

namespace palisade {
namespace {

struct Constant {
  std::string_view name;
  std::string_view value;
};

constexpr Constant constants[] = {
    {"AccountTypeIdentifierFacebook", AccountTypeIdentifierFacebook},
    {"AllAccountsAccessEntitlement", AllAccountsAccessEntitlement},
    {"FacebookDefaultAccessEntitlement", FacebookDefaultAccessEntitlement},
    {"FacebookAppIdKey", FacebookAppIdKey},
    {"FacebookPermissionsKey", FacebookPermissionsKey},
    {"FacebookAudienceKey", FacebookAudienceKey},
    {"FacebookAudienceEveryone", FacebookAudienceEveryone},
    {"FacebookAudienceFriends", FacebookAudienceFriends},
    {"FacebookAudienceOnlyMe", FacebookAudienceOnlyMe},
    {"AccountsErrorDomain", AccountsErrorDomain},
    {"FacebookPreferencesAppID", FacebookPreferencesAppID},
    {"FacebookIgnoreAccessRequests", FacebookIgnoreAccessRequests},
    {"FacebookEnvironmentDidChangeNotification", FacebookEnvironmentDidChangeNotification},
};

std::string translate(std::string_view text, std::string_view Constant::*from, std::string_view Constant::*to) {
  const auto found = std::ranges::find(constants, text, from);
  return std::string(found == std::end(constants) ? text : (*found).*to);
}

}  // namespace

std::string constantValue(std::string_view name) { return translate(name, &Constant::name, &Constant::value); }

std::string constantName(std::string_view value) { return translate(value, &Constant::value, &Constant::name); }

}  // namespace palisade
