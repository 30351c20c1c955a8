#include "DBus/BusValue.h"

#include <sdbus-c++/sdbus-c++.h>

#include <cstdint>
#include <vector>

namespace palisade {
namespace {

template <typename BusType, typename PlatformType = BusType>
bool convertBasic(const sdbus::Variant& variant, Value& value) {
  if (!variant.containsValueOfType<BusType>()) return false;
  value = Value(static_cast<PlatformType>(variant.get<BusType>()));
  return true;
}

template <typename BusType, typename PlatformType = BusType>
bool convertArray(const sdbus::Variant& variant, Value& value) {
  if (!variant.containsValueOfType<std::vector<BusType>>()) return false;
  Array array;
  for (const auto& element : variant.get<std::vector<BusType>>()) array.emplace_back(static_cast<PlatformType>(element));
  value = std::move(array);
  return true;
}

template <typename BusType, typename PlatformType = BusType>
bool convertBasicOrArray(const sdbus::Variant& variant, Value& value) {
  return convertBasic<BusType, PlatformType>(variant, value) || convertArray<BusType, PlatformType>(variant, value);
}

template <typename BusType, typename PlatformType = BusType>
bool convertDictionary(const sdbus::Variant& variant, Value& value) {
  if (!variant.containsValueOfType<std::map<std::string, BusType>>()) return false;
  Dictionary dictionary;
  for (const auto& [key, entry] : variant.get<std::map<std::string, BusType>>()) {
    dictionary.set(key, static_cast<PlatformType>(entry));
  }
  value = std::move(dictionary);
  return true;
}

sdbus::Variant variantFromValue(const Value& value);

sdbus::Variant arrayToBus(const Array& array) {
  std::vector<std::string> strings;
  for (const Value& element : array) {
    if (element.string() == nullptr) break;
    strings.push_back(*element.string());
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
  if (const std::string* text = value.string()) return *text;
  if (const Array* array = value.array()) return arrayToBus(*array);
  if (const Dictionary* dictionary = value.dictionary()) return dictionaryToBus(*dictionary);
  return std::string();
}

}  // namespace

Value valueFromBus(const sdbus::Variant& variant, const std::string& name) {
  Value value;
  if (convertBasicOrArray<std::string>(variant, value) || convertBasicOrArray<bool>(variant, value) ||
      convertBasicOrArray<std::uint8_t, std::int64_t>(variant, value) ||
      convertBasicOrArray<std::int16_t, std::int64_t>(variant, value) ||
      convertBasicOrArray<std::uint16_t, std::int64_t>(variant, value) ||
      convertBasicOrArray<std::int32_t, std::int64_t>(variant, value) ||
      convertBasicOrArray<std::uint32_t, std::int64_t>(variant, value) || convertBasicOrArray<std::int64_t>(variant, value) ||
      convertBasicOrArray<std::uint64_t>(variant, value) || convertBasicOrArray<double>(variant, value) ||
      convertBasicOrArray<sdbus::ObjectPath, std::string>(variant, value) ||
      convertBasicOrArray<sdbus::Signature, std::string>(variant, value) || convertDictionary<std::string>(variant, value) ||
      convertDictionary<bool>(variant, value) || convertDictionary<std::int64_t>(variant, value)) {
    return value;
  }
  if (variant.containsValueOfType<sdbus::Variant>()) return valueFromBus(variant.get<sdbus::Variant>(), name);
  if (variant.containsValueOfType<BusDictionary>()) return dictionaryFromBus(variant.get<BusDictionary>());
  if (variant.containsValueOfType<std::vector<sdbus::Variant>>()) {
    Array array;
    for (const auto& element : variant.get<std::vector<sdbus::Variant>>()) array.push_back(valueFromBus(element, name));
    return array;
  }
  throw UnsuitableType("'" + name + "' has the type '" + variant.peekValueType() +
                       "', which has no meaning here. Use strings, numbers, booleans, and arrays or dictionaries of variants.");
}

Dictionary dictionaryFromBus(const BusDictionary& entries) {
  Dictionary dictionary;
  for (const auto& [key, variant] : entries) dictionary.set(key, valueFromBus(variant, key));
  return dictionary;
}

BusDictionary dictionaryToBus(const Dictionary& dictionary) {
  BusDictionary entries;
  for (const auto& [key, value] : dictionary) {
    if (!value.isNull()) entries.emplace(key, variantFromValue(value));
  }
  return entries;
}

}  // namespace palisade
