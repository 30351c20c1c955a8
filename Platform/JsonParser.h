#pragma once

/// Parses JSON (RFC 8259) that comes from a server.
///
/// Every JSON text in UTF-8 is read, a byte order mark before it is passed over, and "\u0000" in a string or a name is a
/// character like any other: who shows a text or keeps it decides what it makes of that. Beyond the grammar these are parse
/// errors: arrays and objects nested more than 32 deep, a name that occurs twice in one object (whichever way it is escaped),
/// and a number that is too large for a double.
/// Threads: safe from every thread. Ownership: results are values.
/// Errors: after an error the value is none; the error says where it is and what is wrong, and does not quote the text.

#include <optional>
#include <string_view>

#include "Platform/Error.h"
#include "Platform/Value.h"

namespace palisade {

enum class JsonFragments {
  refused,  ///< only an object or an array may stand at the top
  allowed   ///< any value may
};

struct JsonParseResult {
  std::optional<Value> value;
  std::optional<Error> error;
};

class JsonParser {
 public:
  virtual ~JsonParser() = default;

  virtual JsonParseResult parse(std::string_view data, JsonFragments fragments) const = 0;
};

}  // namespace palisade
