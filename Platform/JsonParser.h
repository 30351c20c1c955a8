#pragma once

/// Parses JSON (RFC 8259).
///
/// Threads: safe from every thread. Ownership: results are values.
/// Errors: malformed text, text that is not UTF-8, names that occur twice in one object, and nesting deeper than the platform
/// allows are errors that say where; the value is then none.

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
