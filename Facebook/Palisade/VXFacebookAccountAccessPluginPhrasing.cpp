// Phrases for the consent sentence: what an app would read, post or manage.
//
// Reading names the objects behind the permissions, the user's own and the friends' apart. Posting names the audience only.
// Managing lists objects. The wording lives in the string table; this file chooses keys and orders names. A missing text is the
// empty string and is used like any other.

#include "Facebook/Palisade/PermissionSetAlgebra.h"
#include "Facebook/Palisade/VXFacebookAccountAccessPlugin.h"
#include "Facebook/Palisade/VXFacebookPermissionCategories.h"
#include "Platform/AccountConstants.h"
#include "Platform/Format.h"
#include "Platform/StringTable.h"

namespace palisade {
namespace {

constexpr std::string_view friendsPrefix = "friends_";

// Names that stand for objects in the string table without being a single permission of the catalogue's read side.
constexpr std::string_view basicProfileName = "basic_profile";
constexpr std::string_view friendListName = "friends";

// Permission names hold ASCII letters, digits and underscores.
std::string upperCased(std::string_view name) {
  std::string upper(name);
  for (char& character : upper) {
    if (character >= 'a' && character <= 'z') character = static_cast<char>(character - 'a' + 'A');
  }
  return upper;
}

template <typename Names>
std::string joined(const Names& names, std::string_view separator) {
  std::string text;
  for (auto name = names.begin(); name != names.end(); ++name) {
    if (name != names.begin()) text += separator;
    text += *name;
  }
  return text;
}

}  // namespace

std::string VXFacebookAccountAccessPlugin::_localizedString(std::string_view key) const {
  return strings().localizedString(key, "", "Localizable");
}

std::optional<std::string> VXFacebookAccountAccessPlugin::_predicateForPermissions(
    const PermissionSet& permissions, std::string_view ofCategory, const std::optional<std::string>& audience) const {
  if (ofCategory == VXFacebookPermissionCategoryBasicRead || ofCategory == VXFacebookPermissionCategoryExtendedRead) {
    const auto userObjects = _userObjectsRequestedByPermissions(permissions);
    const auto friendObjects = _friendObjectsRequestedByPermissions(permissions);
    if (userObjects && friendObjects) {
      return formatText(_localizedString("ACCOUNT_ACCESS_EXTENDED_READ_MULTIPLE"), {*userObjects, *friendObjects});
    }
    if (userObjects) return formatText(_localizedString("ACCOUNT_ACCESS_EXTENDED_READ"), {*userObjects});
    if (friendObjects) return formatText(_localizedString("ACCOUNT_ACCESS_EXTENDED_READ"), {*friendObjects});
    return std::nullopt;
  }

  if (ofCategory == VXFacebookPermissionCategoryWrite) {
    return formatText(_localizedString("ACCCOUNT_ACCESS_WRITE"), {_userFriendlyAudienceString(audience)});
  }

  if (ofCategory == VXFacebookPermissionCategoryManage) {
    ObjectNames names;
    for (const std::string& permission : permissions) names.insert(_objectNameForManagePermission(permission));
    if (names.empty()) return formatText(_localizedString("ACCOUNT_ACCESS_MANAGE_MULTIPLE"), {"", ""});
    if (names.size() == 1) return formatText(_localizedString("ACCOUNT_ACCESS_MANAGE"), {*names.begin()});
    const auto lastName = names.extract(std::prev(names.end()));
    return formatText(_localizedString("ACCOUNT_ACCESS_MANAGE_MULTIPLE"),
                      {joined(names, _localizedString("WORD_LIST_SEPARATOR")), lastName.value()});
  }
  return std::nullopt;
}

std::optional<std::string> VXFacebookAccountAccessPlugin::_userObjectsRequestedByPermissions(
    const PermissionSet& permissions) const {
  ObjectNames names;
  // Details of the profile say more than its basics, so the basics are named only without them.
  if (intersects(_basicReadPermissions(), permissions) && !intersects(_userProfileReadPermissions(), permissions)) {
    names.insert(_objectNameForReadPermission(basicProfileName));
    names.insert(_objectNameForReadPermission(friendListName));
  }
  for (const std::string& permission : intersection(permissions, _extendedReadPermissions())) {
    if (!permission.starts_with(friendsPrefix)) names.insert(_objectNameForReadPermission(permission));
  }
  if (names.empty()) return std::nullopt;
  return _commaSeparatedListWithFormat("ACCOUNT_ACCESS_EXTENDED_READ_USER", names);
}

std::optional<std::string> VXFacebookAccountAccessPlugin::_friendObjectsRequestedByPermissions(
    const PermissionSet& permissions) const {
  ObjectNames names;
  for (const std::string& permission : permissions) {
    if (permission.starts_with(friendsPrefix)) names.insert(_objectNameForReadPermission(permission));
  }
  if (names.empty()) return std::nullopt;
  return _commaSeparatedListWithFormat("ACCOUNT_ACCESS_EXTENDED_READ_FRIENDS", names);
}

std::string VXFacebookAccountAccessPlugin::_commaSeparatedListWithFormat(std::string_view formatKey,
                                                                         const ObjectNames& forObjectNames) const {
  if (forObjectNames.size() == 1) return formatText(_localizedString(formatKey), {*forObjectNames.begin()});

  const std::string multipleFormat = _localizedString(formatText("%@_MULTIPLE", {formatKey}));

  // The basic profile and the friend list lead, whatever else is named.
  ObjectNames remaining = forObjectNames;
  std::vector<std::string> list;
  for (const std::string& leading :
       {_objectNameForReadPermission(basicProfileName), _objectNameForReadPermission(friendListName)}) {
    if (!forObjectNames.contains(leading)) continue;
    list.push_back(leading);
    remaining.erase(leading);
  }
  list.insert(list.end(), remaining.begin(), remaining.end());

  if (list.empty()) return formatText(multipleFormat, {"", ""});
  const std::string lastName = list.back();
  std::erase(list, lastName);
  return formatText(multipleFormat, {joined(list, _localizedString("WORD_LIST_SEPARATOR")), lastName});
}

std::string VXFacebookAccountAccessPlugin::_objectNameForReadPermission(std::string_view permission) const {
  return _localizedString(formatText("FACEBOOK_READ_PERMISSION_%@", {upperCased(permission)}));
}

std::string VXFacebookAccountAccessPlugin::_objectNameForManagePermission(std::string_view permission) const {
  return _localizedString(formatText("FACEBOOK_MANAGE_PERMISSION_%@", {upperCased(permission)}));
}

std::string VXFacebookAccountAccessPlugin::_userFriendlyAudienceString(const std::optional<std::string>& audience) const {
  if (audience == FacebookAudienceFriends) return _localizedString("POST_TO_FRIENDS");
  if (audience == FacebookAudienceOnlyMe) return _localizedString("POST_PRIVATELY");
  return _localizedString("POST_PUBLICALLY");
}

}  // namespace palisade
