#include "Host/Bus/RequestBounds.h"

#include <string>

#include "Host/Bus/AccountsService.h"
#include "Host/Text/ValidText.h"
#include "Platform/AccountConstants.h"

namespace palisade {
namespace {

void require(std::string_view name, std::string_view text, std::size_t most) {
  if (text.size() <= most) return;
  throw BusFailure(BusFailureKind::invalidArguments,
                   "'" + std::string(name) + "' is longer than " + std::to_string(most) + " bytes.");
}

Value shortenedValue(const Value& value, std::size_t longest) {
  if (const std::string* text = value.string()) return shortened(*text, longest);
  const Array* array = value.array();
  if (array == nullptr) return value;
  Array cut;
  for (const Value& element : *array) {
    if (cut.size() == mostPermissions) {
      cut.emplace_back("…");
      break;
    }
    cut.push_back(shortenedValue(element, longestPermission));
  }
  return cut;
}

}  // namespace

void requireName(std::string_view argument, std::string_view text) { require(argument, text, longestName); }

void requireClientID(std::string_view argument, std::string_view text) { require(argument, text, longestClientID); }

void requireBoundedAccessOptions(const Dictionary& options) {
  for (const std::string_view key : {FacebookAppIdKey, FacebookAudienceKey}) {
    const Value* value = options.find(key);
    if (value != nullptr && value->string() != nullptr) requireName(key, *value->string());
  }
  const Value* value = options.find(FacebookPermissionsKey);
  if (value == nullptr || value->array() == nullptr) return;
  if (value->array()->size() > mostPermissions) {
    throw BusFailure(BusFailureKind::invalidArguments, "'" + std::string(FacebookPermissionsKey) + "' holds more than " +
                                                           std::to_string(mostPermissions) + " permissions.");
  }
  forEachString(*value->array(), [](const std::string& permission) {
    if (permission.size() <= longestPermission) return;
    throw BusFailure(BusFailureKind::invalidArguments, "'" + std::string(FacebookPermissionsKey) +
                                                           "' holds a permission of more than " +
                                                           std::to_string(longestPermission) + " bytes.");
  });
}

Dictionary shortenedRow(const Dictionary& row) {
  Dictionary cut;
  for (const auto& [key, value] : row) cut.set(key, shortenedValue(value, longestClientID));
  return cut;
}

}  // namespace palisade
