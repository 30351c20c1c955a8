#include "Host/Json/Json.h"

/// Reading: the library splits the text into events, and a builder makes them a Value.
///
/// What a server sends is hostile until it has been read. So nothing here recurses, nesting is counted before a level is
/// opened, and what the library would accept in silence is refused: a name that occurs twice, a byte 0 (which it takes for the
/// end of the text when it stands outside a string), a number that became infinite. The library's own messages quote the text
/// around an error; they are matched against known phrases and only the texts below are passed on.

#include <algorithm>
#include <iterator>
#include <nlohmann/json.hpp>
#include <utility>
#include <vector>

#include "Host/Json/JsonText.h"

namespace palisade {
namespace {

constexpr std::string_view byteOrderMark = "\xEF\xBB\xBF";
constexpr int libraryNumberOverflow = 406;  // the library's id of that exception

struct Problem {
  JsonErrorCode code;
  std::string_view reason;
};

// Walks the text and leaves behind how far the library has read: its events do not tell where they happened.
class TrackingIterator {
 public:
  // NOLINTBEGIN(readability-identifier-naming): the standard library's names
  using iterator_category = std::input_iterator_tag;
  using value_type = char;
  using difference_type = std::ptrdiff_t;
  using pointer = const char*;
  using reference = const char&;
  // NOLINTEND(readability-identifier-naming)

  TrackingIterator(const char* position, const char*& reached) : _position(position), _reached(&reached) {}

  reference operator*() const { return *_position; }
  TrackingIterator& operator++() {
    *_reached = ++_position;
    return *this;
  }
  TrackingIterator operator++(int) {
    TrackingIterator before = *this;
    ++*this;
    return before;
  }
  friend bool operator==(const TrackingIterator& left, const TrackingIterator& right) {
    return left._position == right._position;
  }

 private:
  const char* _position;
  const char** _reached;
};

// What the library's message means, by the first phrase that occurs in it. `message` ends before the quoted text.
std::string_view reasonForMessage(std::string_view message) {
  static constexpr std::pair<std::string_view, std::string_view> reasons[] = {
      {"unexpected end of input", "the text ends before the value does"},
      {"missing closing quote", "the text ends inside a string"},
      {"invalid literal", "only true, false and null may stand without quotes"},
      {"must be followed by 4 hex digits", "an escape that begins with \\u needs four hexadecimal digits"},
      {"surrogate", "half of a surrogate pair stands alone in a string"},
      {"forbidden character after backslash", "a string holds an unknown escape"},
      {"control character", "a control character in a string must be escaped"},
      {"invalid number", "a number lacks a digit"},
      {"while parsing object key", "a name in double quotes is expected"},
      {"while parsing object separator", "a colon is expected after a name"},
      {"while parsing object", "a comma or a closing brace is expected"},
      {"while parsing array", "a comma or a closing bracket is expected"},
  };
  for (const auto& [phrase, reason] : reasons) {
    if (message.find(phrase) != std::string_view::npos) return reason;
  }
  return "a value is expected";
}

// Receives the library's events. Every operation answers whether to go on; after false, `problem` says why not.
class ValueBuilder {
 public:
  ValueBuilder(std::size_t maximumDepth, NullCharacters nullCharacters)
      : _maximumDepth(maximumDepth),
        _nullCharacters(nullCharacters) {}

  // NOLINTBEGIN(readability-identifier-naming): the library's names
  bool null() { return add(nullptr); }
  bool boolean(bool value) { return add(value); }
  bool number_integer(std::int64_t value) { return add(value); }
  bool number_unsigned(std::uint64_t value) { return add(value); }
  bool number_float(double value, const std::string&) { return add(value); }
  bool string(std::string& value) { return isFreeOfNull(value) && add(std::move(value)); }
  bool binary(nlohmann::json::binary_t&) { return fail(JsonErrorMalformed, "JSON has no binary values"); }

  bool start_object(std::size_t) { return open(Kind::Object); }
  bool end_object() { return close(); }
  bool start_array(std::size_t) { return open(Kind::Array); }
  bool end_array() { return close(); }

  bool key(std::string& name) {
    if (!isFreeOfNull(name)) return false;
    if (_open.back().members.find(name) != nullptr) {
      return fail(JsonErrorDuplicateName, "an object holds this name already");
    }
    _open.back().name = std::move(name);
    return true;
  }

  bool parse_error(std::size_t position, const std::string&, const nlohmann::json::exception& error) {
    _errorPosition = position;
    if (error.id == libraryNumberOverflow) return fail(JsonErrorNumberOutOfRange, "a number is out of range");
    if (_value) return fail(JsonErrorMalformed, "something follows the value");
    const std::string_view message = error.what();
    return fail(JsonErrorMalformed, reasonForMessage(message.substr(0, message.find("; last read"))));
  }
  // NOLINTEND(readability-identifier-naming)

  std::optional<Value>& value() { return _value; }
  const std::optional<Problem>& problem() const { return _problem; }

  // How many bytes the library had read at its own error; none when the builder refused an event.
  const std::optional<std::size_t>& errorPosition() const { return _errorPosition; }

 private:
  enum class Kind { Array, Object };

  // An array or object whose end has not been read, with the name that the next member gets.
  struct Level {
    Kind kind;
    Array elements = {};
    Dictionary members = {};
    std::string name = {};
  };

  bool fail(JsonErrorCode code, std::string_view reason) {
    _problem = Problem{code, reason};
    return false;
  }

  bool isFreeOfNull(std::string_view text) {
    return _nullCharacters == NullCharacters::accepted || text.find('\0') == std::string_view::npos ||
           fail(JsonErrorNullCharacter, "U+0000 is not accepted in a string");
  }

  bool add(Value value) {
    if (_open.empty()) {
      _value = std::move(value);
    } else if (Level& level = _open.back(); level.kind == Kind::Array) {
      level.elements.push_back(std::move(value));
    } else {
      level.members.set(std::move(level.name), std::move(value));
    }
    return true;
  }

  bool open(Kind kind) {
    if (_open.size() == _maximumDepth) return fail(JsonErrorTooDeep, "arrays and objects are nested too deep");
    _open.push_back({.kind = kind});
    return true;
  }

  bool close() {
    Level level = std::move(_open.back());
    _open.pop_back();
    return level.kind == Kind::Array ? add(std::move(level.elements)) : add(std::move(level.members));
  }

  std::size_t _maximumDepth;
  NullCharacters _nullCharacters;
  std::vector<Level> _open;
  std::optional<Value> _value;
  std::optional<Problem> _problem;
  std::optional<std::size_t> _errorPosition;
};

JsonParseResult failure(std::string_view text, std::size_t position, const Problem& problem) {
  const TextPlace place = placeInText(text, position);
  std::string description = "Line " + std::to_string(place.line) + ", column " + std::to_string(place.column) + ": ";
  description.append(problem.reason).append(".");
  return {.value = std::nullopt,
          .error = Error{.domain = std::string(JsonErrorDomain), .code = problem.code, .description = std::move(description)}};
}

}  // namespace

NlohmannJsonParser::NlohmannJsonParser(std::size_t maximumDepth, NullCharacters nullCharacters)
    : _maximumDepth(std::min(maximumDepth, greatestDepth)),
      _nullCharacters(nullCharacters) {}

JsonParseResult NlohmannJsonParser::parse(std::string_view data, JsonFragments fragments) const {
  const std::string_view text = data.starts_with(byteOrderMark) ? data.substr(byteOrderMark.size()) : data;
  const std::size_t start = text.find_first_not_of(" \t\r\n");
  if (start == std::string_view::npos) return failure(text, text.size(), {JsonErrorEmpty, "there is no value"});
  if (const std::size_t position = positionOfInvalidUtf8(text); position != text.size()) {
    return failure(text, position, {JsonErrorNotUtf8, "the text is not UTF-8"});
  }
  if (const std::size_t position = text.find('\0'); position != std::string_view::npos) {
    return failure(text, position, {JsonErrorNullCharacter, "U+0000 is not accepted"});
  }

  const char* reached = text.data();
  const char* const end = text.data() + text.size();
  ValueBuilder builder(_maximumDepth, _nullCharacters);
  if (!nlohmann::json::sax_parse(TrackingIterator(text.data(), reached), TrackingIterator(end, reached), &builder)) {
    const std::size_t bytesRead = builder.errorPosition().value_or(static_cast<std::size_t>(reached - text.data()));
    return failure(text, bytesRead - std::min<std::size_t>(bytesRead, 1), *builder.problem());
  }

  std::optional<Value>& value = builder.value();
  if (fragments == JsonFragments::refused && value->array() == nullptr && value->dictionary() == nullptr) {
    return failure(text, start, {JsonErrorFragment, "an object or an array is expected"});
  }
  return {.value = std::move(value), .error = std::nullopt};
}

}  // namespace palisade
