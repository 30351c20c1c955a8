#pragma once

/// The error that a completion carries.
///
/// Purpose: tells a caller which layer refused (`domain`), why (`code`, whose meaning belongs to the domain) and, when there is
/// something to say, a message for people (`description`). "Access denied" is an answer with an error; "none" (an empty
/// optional) is an answer without one.
/// Threads and ownership: a plain value.

#include <optional>
#include <string>
#include <string_view>

namespace palisade {

/// The one user-info entry that the platform knows.
inline constexpr std::string_view ErrorDescriptionKey = "description";

struct Error {
  std::string domain;
  int code = 0;
  /// The user info's description entry; none when the error carries no user info.
  std::optional<std::string> description = std::nullopt;

  friend bool operator==(const Error&, const Error&) = default;
};

}  // namespace palisade
