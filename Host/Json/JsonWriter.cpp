#include "Host/Json/Json.h"

/// Writing: the library writes the scalars; arrays and objects are walked here, without recursion, because a value may be
/// nested deeper than the library's own writer survives.

#include <algorithm>
#include <cmath>
#include <nlohmann/json.hpp>
#include <vector>

#include "Host/Json/JsonText.h"

namespace palisade {
namespace {

std::string scalar(const nlohmann::json& value) { return value.dump(-1, ' ', false, nlohmann::json::error_handler_t::replace); }

std::string scalar(const Value& value) {
  if (const bool* boolean = value.boolean()) return scalar(nlohmann::json(*boolean));
  if (const std::int64_t* integer = value.integer()) return scalar(nlohmann::json(*integer));
  if (const std::uint64_t* integer = value.largeInteger()) return scalar(nlohmann::json(*integer));
  if (const double* real = value.real()) return scalar(nlohmann::json(*real));
  if (const std::string* string = value.string()) return scalar(nlohmann::json(*string));
  return "null";
}

// An array or object whose closing bracket has not been written. One of the two is none.
struct Level {
  const Array* array;
  const Dictionary* dictionary;
  std::size_t next = 0;

  std::size_t size() const { return array != nullptr ? array->size() : dictionary->size(); }
};

class Writer {
 public:
  std::string write(const Value& value) {
    begin(value);
    while (!_open.empty()) {
      Level& level = _open.back();
      if (level.next == level.size()) {
        _text += level.array != nullptr ? ']' : '}';
        _open.pop_back();
      } else {
        begin(nextElement(level));
      }
    }
    return std::move(_text);
  }

 private:
  void begin(const Value& value) {
    if (value.array() == nullptr && value.dictionary() == nullptr) {
      _text += scalar(value);
      return;
    }
    _text += value.array() != nullptr ? '[' : '{';
    _open.push_back({.array = value.array(), .dictionary = value.dictionary()});
  }

  // Writes what stands before the element.
  const Value& nextElement(Level& level) {
    if (level.next > 0) _text += ',';
    const std::size_t index = level.next++;
    if (level.array != nullptr) return (*level.array)[index];
    const Dictionary::Entry& entry = *(level.dictionary->begin() + static_cast<std::ptrdiff_t>(index));
    _text += scalar(nlohmann::json(entry.first));
    _text += ':';
    return entry.second;
  }

  std::string _text;
  std::vector<Level> _open;
};

bool survives(std::string_view text) {
  return text.find('\0') == std::string_view::npos && positionOfInvalidUtf8(text) == text.size();
}

}  // namespace

std::string writeJson(const Value& value) { return Writer().write(value); }

bool survivesJson(const Value& value, std::size_t maximumDepth) {
  if (const std::string* text = value.string()) return survives(*text);
  if (const double* real = value.real()) return std::isfinite(*real);
  if (value.array() == nullptr && value.dictionary() == nullptr) return true;
  if (maximumDepth == 0) return false;
  if (const Array* array = value.array()) {
    return std::ranges::all_of(*array, [&](const Value& element) { return survivesJson(element, maximumDepth - 1); });
  }
  return std::ranges::all_of(*value.dictionary(), [&](const Dictionary::Entry& entry) {
    return survives(entry.first) && survivesJson(entry.second, maximumDepth - 1);
  });
}

}  // namespace palisade
