#include "DBus/BusValue.h"

#include <sdbus-c++/sdbus-c++.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <optional>
#include <string_view>
#include <utility>
#include <vector>

#include "Host/Text/ValidText.h"

namespace palisade {
namespace {

// What a dictionary may still hold.
class Room {
 public:
  void take(std::string_view text = {}) {
    constexpr std::size_t ofEachValue = 8;
    const std::size_t taken = ofEachValue + text.size();
    if (taken > _left) throw TooLarge();
    _left -= taken;
  }

 private:
  std::size_t _left = largestBusDictionary;
};

sdbus::Variant variantFromValue(const Value& value, Room& room);

std::string textToBus(const std::string& text, Room& room) {
  room.take(text);
  return validText(text);
}

sdbus::Variant arrayToBus(const Array& array, Room& room) {
  if (std::ranges::all_of(array, [](const Value& element) { return element.string() != nullptr; })) {
    std::vector<std::string> strings;
    for (const Value& element : array) strings.push_back(textToBus(*element.string(), room));
    return strings;
  }
  std::vector<sdbus::Variant> variants;
  for (const Value& element : array) variants.push_back(variantFromValue(element, room));
  return variants;
}

BusDictionary dictionaryToBus(const Dictionary& dictionary, Room& room) {
  BusDictionary entries;
  for (const auto& [key, value] : dictionary) {
    if (!value.isNull()) entries.emplace(textToBus(key, room), variantFromValue(value, room));
  }
  return entries;
}

sdbus::Variant variantFromValue(const Value& value, Room& room) {
  if (const std::string* text = value.string()) return textToBus(*text, room);
  room.take();
  if (const bool* boolean = value.boolean()) return *boolean;
  if (const std::int64_t* integer = value.integer()) return *integer;
  if (const std::uint64_t* largeInteger = value.largeInteger()) return *largeInteger;
  if (const double* real = value.real()) return *real;
  if (const Array* array = value.array()) return arrayToBus(*array, room);
  if (const Dictionary* dictionary = value.dictionary()) return dictionaryToBus(*dictionary, room);
  return std::string();
}

template <typename BusType, typename PlatformType = BusType>
Value read(sdbus::Message& message) {
  BusType content{};
  message >> content;
  return static_cast<PlatformType>(std::move(content));
}

template <typename BusType>
std::string readText(sdbus::Message& message, Room& room) {
  BusType content;
  message >> content;
  room.take(content);
  return content;
}

std::optional<Value> readNext(sdbus::Message& message, const std::string& key, Room& room);

Value readVariant(sdbus::Message& message, const std::string& contents, const std::string& key, Room& room) {
  message.enterVariant(contents);
  Value content = *readNext(message, key, room);
  message.exitVariant();
  return content;
}

// `entry` is the signature of one entry, without its braces.
Dictionary readDictionary(sdbus::Message& message, const std::string& entry, Room& room) {
  Dictionary dictionary;
  // At the end of an array of dictionaries the message says so.
  if (!message.enterContainer('{' + entry + '}')) return dictionary;
  while (message.enterDictEntry(entry)) {
    std::string key = readText<std::string>(message, room);
    Value value = *readNext(message, key, room);
    dictionary.set(std::move(key), std::move(value));
    message.exitDictEntry();
  }
  message.clearFlags();
  message.exitContainer();
  return dictionary;
}

Array readArray(sdbus::Message& message, const std::string& element, const std::string& key, Room& room) {
  Array array;
  message.enterContainer(element);
  while (auto next = readNext(message, key, room)) array.push_back(*std::move(next));
  message.exitContainer();
  return array;
}

// None at the end of an array.
std::optional<Value> readNext(sdbus::Message& message, const std::string& key, Room& room) {
  std::string type;
  std::string contents;
  message.peekType(type, contents);
  if (type.front() == '\0') return std::nullopt;
  if (type == "s") return readText<std::string>(message, room);
  if (type == "o") return readText<sdbus::ObjectPath>(message, room);
  if (type == "g") return readText<sdbus::Signature>(message, room);
  room.take();
  switch (type.front()) {
    case 'b': return read<bool>(message);
    case 'y': return read<std::uint8_t, std::int64_t>(message);
    case 'n': return read<std::int16_t, std::int64_t>(message);
    case 'q': return read<std::uint16_t, std::int64_t>(message);
    case 'i': return read<std::int32_t, std::int64_t>(message);
    case 'u': return read<std::uint32_t, std::int64_t>(message);
    case 'x': return read<std::int64_t>(message);
    case 't': return read<std::uint64_t>(message);
    case 'd': return read<double>(message);
    case 'v': return readVariant(message, contents, key, room);
    case 'a':
      if (contents.starts_with("{s")) return readDictionary(message, contents.substr(1, contents.size() - 2), room);
      if (!contents.starts_with('{')) return readArray(message, contents, key, room);
      break;
    default: break;
  }
  const std::string signature = type == "r" ? '(' + contents + ')' : type + contents;
  throw UnsuitableType(
      "'" + shortened(key, 64) + "' holds a value of the type '" + signature +
      "', which has no meaning here. Use strings, numbers, booleans, arrays, and dictionaries with strings for keys.");
}

}  // namespace

sdbus::Message& operator>>(sdbus::Message& message, Dictionary& dictionary) {
  Room room;
  dictionary = readDictionary(message, "sv", room);
  return message;
}

BusDictionary dictionaryToBus(const Dictionary& dictionary) {
  Room room;
  return dictionaryToBus(dictionary, room);
}

}  // namespace palisade
