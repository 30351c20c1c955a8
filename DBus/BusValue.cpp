#include "DBus/BusValue.h"

#include <sdbus-c++/sdbus-c++.h>

#include <cstdint>
#include <optional>
#include <utility>
#include <vector>

#include "Host/Text/ValidText.h"

namespace palisade {
namespace {

sdbus::Variant variantFromValue(const Value& value);

sdbus::Variant arrayToBus(const Array& array) {
  std::vector<std::string> strings;
  for (const Value& element : array) {
    if (element.string() == nullptr) break;
    strings.push_back(validText(*element.string()));
  }
  if (strings.size() == array.size()) return strings;
  std::vector<sdbus::Variant> variants;
  for (const Value& element : array) variants.push_back(variantFromValue(element));
  return variants;
}

sdbus::Variant variantFromValue(const Value& value) {
  if (const bool* boolean = value.boolean()) return *boolean;
  if (const std::int64_t* integer = value.integer()) return *integer;
  if (const std::uint64_t* largeInteger = value.largeInteger()) return *largeInteger;
  if (const double* real = value.real()) return *real;
  if (const std::string* text = value.string()) return validText(*text);
  if (const Array* array = value.array()) return arrayToBus(*array);
  if (const Dictionary* dictionary = value.dictionary()) return dictionaryToBus(*dictionary);
  return std::string();
}

template <typename BusType, typename PlatformType = BusType>
Value read(sdbus::Message& message) {
  BusType content{};
  message >> content;
  return static_cast<PlatformType>(std::move(content));
}

std::optional<Value> readNext(sdbus::Message& message, const std::string& key);

Value readVariant(sdbus::Message& message, const std::string& contents, const std::string& key) {
  message.enterVariant(contents);
  Value content = *readNext(message, key);
  message.exitVariant();
  return content;
}

// `entry` is the signature of one entry, without its braces.
Dictionary readDictionary(sdbus::Message& message, const std::string& entry) {
  Dictionary dictionary;
  // At the end of an array of dictionaries the message says so.
  if (!message.enterContainer('{' + entry + '}')) return dictionary;
  while (message.enterDictEntry(entry)) {
    std::string key;
    message >> key;
    Value value = *readNext(message, key);
    dictionary.set(std::move(key), std::move(value));
    message.exitDictEntry();
  }
  message.clearFlags();
  message.exitContainer();
  return dictionary;
}

Array readArray(sdbus::Message& message, const std::string& element, const std::string& key) {
  Array array;
  message.enterContainer(element);
  while (auto next = readNext(message, key)) array.push_back(*std::move(next));
  message.exitContainer();
  return array;
}

// None at the end of an array.
std::optional<Value> readNext(sdbus::Message& message, const std::string& key) {
  std::string type;
  std::string contents;
  message.peekType(type, contents);
  switch (type.front()) {
    case '\0': return std::nullopt;
    case 's': return read<std::string>(message);
    case 'o': return read<sdbus::ObjectPath, std::string>(message);
    case 'g': return read<sdbus::Signature, std::string>(message);
    case 'b': return read<bool>(message);
    case 'y': return read<std::uint8_t, std::int64_t>(message);
    case 'n': return read<std::int16_t, std::int64_t>(message);
    case 'q': return read<std::uint16_t, std::int64_t>(message);
    case 'i': return read<std::int32_t, std::int64_t>(message);
    case 'u': return read<std::uint32_t, std::int64_t>(message);
    case 'x': return read<std::int64_t>(message);
    case 't': return read<std::uint64_t>(message);
    case 'd': return read<double>(message);
    case 'v': return readVariant(message, contents, key);
    case 'a':
      if (contents.starts_with("{s")) return readDictionary(message, contents.substr(1, contents.size() - 2));
      if (!contents.starts_with('{')) return readArray(message, contents, key);
      break;
    default: break;
  }
  const std::string signature = type == "r" ? '(' + contents + ')' : type + contents;
  throw UnsuitableType(
      "'" + key + "' holds a value of the type '" + signature +
      "', which has no meaning here. Use strings, numbers, booleans, arrays, and dictionaries with strings for keys.");
}

}  // namespace

sdbus::Message& operator>>(sdbus::Message& message, Dictionary& dictionary) {
  dictionary = readDictionary(message, "sv");
  return message;
}

BusDictionary dictionaryToBus(const Dictionary& dictionary) {
  BusDictionary entries;
  for (const auto& [key, value] : dictionary) {
    if (!value.isNull()) entries.emplace(validText(key), variantFromValue(value));
  }
  return entries;
}

}  // namespace palisade
