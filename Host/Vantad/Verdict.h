#pragma once

/// What an answer of the Facebook server, or the lack of one, means for an invalidation.
///
/// Threads: pure. Ownership: values. Errors: none; what is not understood means that the token may still be valid.

#include <chrono>
#include <optional>
#include <string>

#include "Host/Http/HttpClient.h"

namespace palisade {

class JsonParser;

struct Verdict {
  enum class Kind {
    confirmed,  ///< the token is invalid
    refused,    ///< asking again does not help
    tryAgain,   ///< the token is still valid as far as anybody knows
    untried     ///< nobody asked the server
  };

  Kind kind = Kind::tryAgain;

  /// Whether every other request would fare alike.
  bool concernsServer = false;

  /// How long the server asks to be left alone.
  std::optional<std::chrono::seconds> retryAfter = std::nullopt;

  /// For people. Holds nothing that the server said.
  std::string sentence = {};
};

Verdict judge(const HttpResult& result, const JsonParser& json);

}  // namespace palisade
