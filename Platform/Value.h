#pragma once

/// The dynamically typed value that crosses the platform's interfaces: client options, preference values, parsed JSON.
///
/// Purpose: null, booleans, numbers, strings, arrays and dictionaries are told apart, because a caller's type decides what a
/// request means. A null that was written and a value that was never written differ too: the first is a Value, the second is
/// "none" (an empty optional or a null pointer).
/// Threads: a plain value. Reading one object from several threads is safe while nobody changes it.
/// Ownership: a Value owns everything below it. Copying is deep.
/// Errors: no operation fails; a getter of the wrong type answers none.

#include <cstddef>
#include <cstdint>
#include <initializer_list>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <variant>
#include <vector>

namespace palisade {

class Value;

using Array = std::vector<Value>;

/// String keys with one value each, enumerated in the order in which the keys were first set.
class Dictionary {
 public:
  using Entry = std::pair<std::string, Value>;

  Dictionary();
  Dictionary(std::initializer_list<Entry> entries);
  Dictionary(const Dictionary&);
  Dictionary(Dictionary&&) noexcept;
  Dictionary& operator=(const Dictionary&);
  Dictionary& operator=(Dictionary&&) noexcept;
  ~Dictionary();

  /// Puts `value` under `key`, in place of any earlier one.
  void set(std::string key, Value value);

  /// The value under `key`, or none. Valid until the dictionary changes.
  const Value* find(std::string_view key) const;

  std::size_t size() const;
  bool empty() const;
  std::vector<Entry>::const_iterator begin() const;
  std::vector<Entry>::const_iterator end() const;

  /// Equal when both hold the same keys with equal values, in whatever order.
  friend bool operator==(const Dictionary&, const Dictionary&);

 private:
  std::vector<Entry> _entries;
  std::map<std::string, std::size_t, std::less<>> _positions;
};

class Value {
 public:
  Value() = default;
  Value(std::nullptr_t) {}
  Value(bool value) : _content(value) {}
  Value(int value) : _content(std::int64_t{value}) {}
  Value(std::int64_t value) : _content(value) {}
  /// Whole numbers above the signed range keep their digits; all others are held signed.
  Value(std::uint64_t value);
  Value(double value) : _content(value) {}
  Value(std::string value) : _content(std::move(value)) {}
  Value(std::string_view value) : _content(std::string(value)) {}
  Value(const char* value) : _content(std::string(value)) {}
  Value(Array value) : _content(std::move(value)) {}
  Value(Dictionary value) : _content(std::move(value)) {}

  bool isNull() const { return std::holds_alternative<std::nullptr_t>(_content); }
  bool isNumber() const { return integer() != nullptr || largeInteger() != nullptr || real() != nullptr; }

  /// The content when it has that type, otherwise none. A number is no boolean and a boolean is no number.
  const bool* boolean() const { return std::get_if<bool>(&_content); }
  const std::string* string() const { return std::get_if<std::string>(&_content); }
  const Array* array() const { return std::get_if<Array>(&_content); }
  const Dictionary* dictionary() const { return std::get_if<Dictionary>(&_content); }
  const std::int64_t* integer() const { return std::get_if<std::int64_t>(&_content); }
  const std::uint64_t* largeInteger() const { return std::get_if<std::uint64_t>(&_content); }
  const double* real() const { return std::get_if<double>(&_content); }

  friend bool operator==(const Value&, const Value&) = default;

 private:
  std::variant<std::nullptr_t, bool, std::int64_t, std::uint64_t, double, std::string, Array, Dictionary> _content;
};

/// Calls `visit(const std::string&)` for each element of `array` that is a string. Permission lists come from clients and from
/// the server; elements of another type mean nothing there and are passed over.
template <typename Visitor>
void forEachString(const Array& array, Visitor visit) {
  for (const Value& element : array) {
    if (const std::string* text = element.string()) visit(*text);
  }
}

}  // namespace palisade
