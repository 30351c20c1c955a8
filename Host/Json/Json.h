#pragma once

/// Reads and writes JSON (RFC 8259) for the daemon and its tools.
///
/// Threads: everything here is safe from every thread. Ownership: results are values.
/// Errors: `parse` answers an error in `JsonErrorDomain` whose description says the line, the column (in characters) and what
/// is wrong. It never quotes the text, because the text may hold a token. After an error there is no value. `writeJson` does
/// not fail.

#include <cstddef>
#include <string>
#include <string_view>

#include "Platform/JsonParser.h"
#include "Platform/Value.h"

namespace palisade {

inline constexpr std::string_view JsonErrorDomain = "JsonErrorDomain";

/// Codes in `JsonErrorDomain`.
enum JsonErrorCode : int {
  JsonErrorMalformed = 1,         ///< not JSON: a syntax error, an unpaired surrogate, something after the value
  JsonErrorNotUtf8 = 2,           ///< a byte sequence that is not UTF-8
  JsonErrorTooDeep = 3,           ///< arrays and objects nested deeper than the limit
  JsonErrorDuplicateName = 4,     ///< a name that occurs twice in one object, whichever way each one is escaped
  JsonErrorNullCharacter = 5,     ///< U+0000 as a byte; escaped in a string or name where null characters are refused
  JsonErrorFragment = 6,          ///< neither an object nor an array at the top, and fragments are refused
  JsonErrorEmpty = 7,             ///< nothing, or white space only
  JsonErrorNumberOutOfRange = 8,  ///< a number that no finite double comes near, such as 1e400
};

/// Whether an escaped U+0000 may stand in a string or a name. Documents of our own never hold one and refuse it.
enum class NullCharacters { refused, accepted };

/// The parser that the daemon hands to its plug-ins.
///
/// Members keep their order. Whole numbers are kept exactly from -2^63 to 2^64-1 and become the nearest double beyond that;
/// numbers with a fraction or an exponent are doubles. A byte order mark before the text is passed over.
class NlohmannJsonParser final : public JsonParser {
 public:
  /// The deepest nesting that any parser accepts: values are copied and destroyed level by level on the stack.
  static constexpr std::size_t greatestDepth = 512;

  /// Accepts arrays and objects nested `maximumDepth` deep, at most `greatestDepth`. With 0 only a bare value is accepted.
  explicit NlohmannJsonParser(std::size_t maximumDepth = 32, NullCharacters nullCharacters = NullCharacters::accepted);

  JsonParseResult parse(std::string_view data, JsonFragments fragments) const override;

 private:
  std::size_t _maximumDepth;
  NullCharacters _nullCharacters;
};

/// The value as compact JSON on one line. Bytes that are not UTF-8 become U+FFFD, numbers that are not finite become null.
std::string writeJson(const Value& value);

/// Whether a parser that accepts `maximumDepth` levels and no null characters reads what `writeJson` writes as an equal value:
/// that holds no bytes that are not UTF-8, no number that is not finite, no U+0000, and no level more.
bool survivesJson(const Value& value, std::size_t maximumDepth);

}  // namespace palisade
