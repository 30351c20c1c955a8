#pragma once

/// The error that a completion carries.
///
/// Purpose: tells a caller which layer refused (`domain`), why (`code`, whose meaning belongs to the domain) and, when there is
/// something to say, a message for people (`description`). "Access denied" is an answer with an error; "none" (an empty
/// optional) is an answer without one.
/// Whoever passes an error on passes all of it on.
/// Threads and ownership: a plain value.

#include <optional>
#include <string>
#include <string_view>

#include "Platform/Value.h"

namespace palisade {

/// The one user-info entry that the platform reads.
inline constexpr std::string_view ErrorDescriptionKey = "description";

struct Error {
  std::string domain;
  int code = 0;
  /// The user info's description entry, or none.
  std::optional<std::string> description = std::nullopt;
  /// The user info's other entries, whatever the service that made the error put there.
  Dictionary furtherInfo = {};

  friend bool operator==(const Error&, const Error&) = default;
};

}  // namespace palisade
