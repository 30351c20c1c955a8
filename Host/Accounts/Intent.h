#pragma once

/// A change of a client's access that takes several steps, as it is noted before the first of them: what a crash leaves of it
/// can then be told from a change that is whole. Threads: a value. Errors: none.

#include <optional>
#include <string>

namespace palisade {

struct Intent {
  enum class Kind {
    grant,       ///< a token comes first, then the record
    revocation,  ///< the token goes first, then the record says so
    removal      ///< the token goes first, then the record
  };

  Kind kind = Kind::grant;
  std::string accountTypeIdentifier;
  std::string clientID;
  /// The app whose token is stored; none when the client's record tells.
  std::optional<std::string> appID = std::nullopt;
};

}  // namespace palisade
