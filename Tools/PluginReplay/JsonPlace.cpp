#include "Tools/PluginReplay/JsonPlace.h"

#include <algorithm>
#include <limits>

#include "Platform/Format.h"

namespace palisade {
namespace {

std::string_view typeOf(const Value& value) {
  if (value.isNull()) return "null";
  if (value.boolean() != nullptr) return "a boolean";
  if (value.isNumber()) return "a number";
  if (value.string() != nullptr) return "a text";
  return value.array() != nullptr ? "an array" : "an object";
}

bool isPlainName(std::string_view name) {
  constexpr std::string_view plain = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789_-$";
  return !name.empty() && name.find_first_not_of(plain) == std::string_view::npos;
}

std::string joined(std::initializer_list<std::string_view> names) {
  std::string text;
  for (const std::string_view name : names) {
    if (!text.empty()) text += ", ";
    text += name;
  }
  return text;
}

}  // namespace

const std::string& JsonPlace::text() const {
  const std::string* text = _value->string();
  if (text == nullptr) failAsNo("a text");
  return *text;
}

bool JsonPlace::boolean() const {
  const bool* boolean = _value->boolean();
  if (boolean == nullptr) failAsNo("a boolean");
  return *boolean;
}

int JsonPlace::integer() const {
  if (!_value->isNumber()) failAsNo("a whole number");
  const std::int64_t* number = _value->integer();
  if (number == nullptr || *number < std::numeric_limits<int>::min() || *number > std::numeric_limits<int>::max()) {
    fail("has to be a whole number from " + std::to_string(std::numeric_limits<int>::min()) + " to " +
         std::to_string(std::numeric_limits<int>::max()) + ", is " + compactJson(*_value));
  }
  return static_cast<int>(*number);
}

std::vector<JsonPlace> JsonPlace::elements() const {
  const Array* array = _value->array();
  if (array == nullptr) failAsNo("an array");
  std::vector<JsonPlace> places;
  for (const Value& element : *array) places.emplace_back(element, _path + '[' + std::to_string(places.size()) + ']');
  return places;
}

std::vector<std::pair<std::string, JsonPlace>> JsonPlace::entries() const {
  std::vector<std::pair<std::string, JsonPlace>> places;
  for (const auto& [name, value] : dictionary()) places.emplace_back(name, member(name, value));
  return places;
}

JsonObject JsonPlace::object(std::initializer_list<std::string_view> members) const {
  auto present = entries();
  for (const auto& [name, place] : present) {
    if (std::ranges::find(members, name) == members.end()) {
      place.fail("there is no such member; there are: " + joined(members));
    }
  }
  return {*this, std::move(present)};
}

void JsonPlace::fail(const std::string& problem) const {
  throw ScenarioError((_path.empty() ? std::string("the scenario") : _path) + ": " + problem);
}

void JsonPlace::failAsNo(std::string_view expectedType) const {
  fail("has to be " + std::string(expectedType) + ", is " + std::string(typeOf(*_value)));
}

JsonPlace JsonPlace::member(const std::string& name, const Value& value) const {
  if (!isPlainName(name)) return {value, _path + '[' + compactJson(Value(name)) + ']'};
  return {value, _path.empty() ? name : _path + '.' + name};
}

const Dictionary& JsonPlace::dictionary() const {
  const Dictionary* dictionary = _value->dictionary();
  if (dictionary == nullptr) failAsNo("an object");
  return *dictionary;
}

std::optional<JsonPlace> JsonObject::find(std::string_view member) const {
  for (const auto& [name, place] : _entries) {
    if (name == member) return place;
  }
  return std::nullopt;
}

std::optional<JsonPlace> JsonObject::findValue(std::string_view member) const {
  auto place = find(member);
  return place && place->isNull() ? std::nullopt : place;
}

JsonPlace JsonObject::require(std::string_view member) const {
  auto place = find(member);
  if (!place) _place.fail("the member \"" + std::string(member) + "\" is missing");
  return *std::move(place);
}

}  // namespace palisade
