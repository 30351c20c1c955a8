// The options that a client passes with its request, and the reduced copy that a grant keeps.
//
// Readers test types and nothing else: a missing key and a value of another type read as none, in a request as in a damaged
// record. Validation decides whether a request may go on; it looks neither at the content of the app ID nor at which audience
// was named.

#include "Facebook/Palisade/PermissionSetAlgebra.h"
#include "Facebook/Palisade/VXFacebookAccountAccessPlugin.h"
#include "Platform/AccountConstants.h"

namespace palisade {
namespace {

const Value* find(const Dictionary* options, std::string_view key) { return options == nullptr ? nullptr : options->find(key); }

std::optional<std::string> stringUnder(const Dictionary* options, std::string_view key) {
  const Value* value = find(options, key);
  if (value == nullptr || value->string() == nullptr) return std::nullopt;
  return *value->string();
}

// None when the key is absent or holds a value of another type.
const Array* arrayUnder(const Dictionary* options, std::string_view key) {
  const Value* value = find(options, key);
  return value == nullptr ? nullptr : value->array();
}

}  // namespace

std::optional<std::string> VXFacebookAccountAccessPlugin::_appIDFromOptionsDictionary(const Dictionary* options) const {
  return stringUnder(options, FacebookAppIdKey);
}

PermissionSet VXFacebookAccountAccessPlugin::_permissionsFromOptionsDictionary(const Dictionary* options) const {
  const Array* permissions = arrayUnder(options, FacebookPermissionsKey);
  return permissions == nullptr ? PermissionSet() : permissionSetFromArray(*permissions);
}

std::optional<std::string> VXFacebookAccountAccessPlugin::_audienceFromOptionsDictionary(const Dictionary* options) const {
  return stringUnder(options, FacebookAudienceKey);
}

bool VXFacebookAccountAccessPlugin::_validateOptionsDictionary(const Dictionary* options) const {
  const Value* appID = find(options, FacebookAppIdKey);
  const bool hasAppID = appID != nullptr && appID->string() != nullptr && !appID->string()->empty();

  const Array* permissions = arrayUnder(options, FacebookPermissionsKey);
  const bool permissionsAreArray = permissions != nullptr || find(options, FacebookPermissionsKey) == nullptr;

  bool asksToPublish = false;
  if (permissions != nullptr) {
    forEachString(*permissions, [&](const std::string& name) { asksToPublish |= _writePermissions().contains(name); });
  }
  const Value* audience = find(options, FacebookAudienceKey);
  const bool hasAudience = audience != nullptr && audience->string() != nullptr;

  return hasAppID && permissionsAreArray && (hasAudience || !asksToPublish);
}

std::shared_ptr<const Dictionary> VXFacebookAccountAccessPlugin::_persistentDictionaryForOptions(
    const Dictionary* options) const {
  auto persistentOptions = std::make_shared<Dictionary>();
  for (const std::string_view key : {FacebookAppIdKey, FacebookAudienceKey}) {
    if (const Value* value = find(options, key)) persistentOptions->set(std::string(key), *value);
  }
  return persistentOptions;
}

std::string VXFacebookAccountAccessPlugin::_csvStringFromSet(const PermissionSet* set) const {
  std::string list;
  if (set == nullptr) return list;
  for (const std::string& element : *set) {
    if (&element != &*set->begin()) list += ',';
    list += element;
  }
  return list;
}

}  // namespace palisade
