// The consent message: one sentence that says which app asks and what it wants to do.
//
// The permissions are sorted by the catalogue into at most three phrases, always in the order read, write, manage. The number
// of phrases chooses the sentence. What the catalogue does not know is described by the server; without that description there
// is no message at all, since a sentence that leaves something out would mislead the user.

#include "Facebook/Palisade/PermissionSetAlgebra.h"
#include "Facebook/Palisade/VXFacebookAccountAccessPlugin.h"
#include "Facebook/Palisade/VXFacebookPermissionCategories.h"
#include "Platform/Format.h"

namespace palisade {
namespace {

constexpr const char* constructUserMessage = "_constructUserMessageForPermissions:audience:appName:account:";

}  // namespace

std::optional<std::string> VXFacebookAccountAccessPlugin::_constructUserMessageForPermissions(
    const PermissionSet& permissions, const std::optional<std::string>& audience, const std::string& appName,
    const std::shared_ptr<Account>& account) const {
  log().record(constructUserMessage, LogLevel::debug, "Generating user message for permission: %@.", "permissions",
               permissions);

  std::vector<std::string> phrases;
  const auto appendPhrase = [&](const PermissionSet& asked, const char* category) {
    if (asked.empty()) return;
    if (auto phrase = _predicateForPermissions(asked, category, audience)) phrases.push_back(*std::move(phrase));
  };
  const PermissionSet reading = intersection(permissions, _allReadPermissions());
  appendPhrase(reading, VXFacebookPermissionCategoryExtendedRead);
  const PermissionSet writing = intersection(permissions, *_allPermissionsInCategory(VXFacebookPermissionCategoryWrite));
  appendPhrase(writing, VXFacebookPermissionCategoryWrite);
  const PermissionSet managing = intersection(permissions, *_allPermissionsInCategory(VXFacebookPermissionCategoryManage));
  appendPhrase(managing, VXFacebookPermissionCategoryManage);

  PermissionSet remaining = permissions;
  for (const PermissionSet* known :
       {&_basicReadPermissions(), &_extendedReadPermissions(), &_writePermissions(), &_managePermissions()}) {
    subtract(remaining, *known);
  }
  const auto unknown = std::make_shared<const PermissionSet>(std::move(remaining));
  if (!unknown->empty()) log().record(constructUserMessage, LogLevel::debug, "Unknown permissions were requested!", "");

  const bool onlyReads = writing.empty() && managing.empty() && unknown->empty();

  std::optional<std::string> message;
  switch (phrases.size()) {
    case 0:
      if (unknown->empty()) message = formatText(_localizedString("ACCOUNT_ACCESS_BASIC_MESSAGE"), {appName});
      break;
    case 1:
      message = formatText(
          _localizedString(onlyReads ? "ACCOUNT_ACCESS_ONE_PERMISSION_SHORT_FORMAT" : "ACCOUNT_ACCESS_ONE_PERMISSION_FORMAT"),
          {appName, phrases[0]});
      break;
    case 2:
      message = formatText(_localizedString("ACCOUNT_ACCESS_TWO_PERMISSION_FORMAT"), {appName, phrases[0], phrases[1]});
      break;
    default:
      message =
          formatText(_localizedString("ACCOUNT_ACCESS_THREE_PERMISSION_FORMAT"), {appName, phrases[0], phrases[1], phrases[2]});
      break;
  }

  if (!unknown->empty()) message = _appendDescriptionOfUnknownPermissions(unknown, message, appName, audience, account);
  if (!message) {
    log().record(constructUserMessage, LogLevel::debug,
                 "Something went wrong and we ended up with a nil user message. Falling back to default.", "");
  }
  return message;
}

}  // namespace palisade
