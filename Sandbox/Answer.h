#pragma once

/// What the sandbox's server says to one request, before it is written as HTTP. A value.

#include <optional>
#include <string>
#include <utility>

#include "Platform/Value.h"

namespace palisade::sandbox {

struct Answer {
  int status = 200;
  /// The body as JSON; none sends no body.
  std::optional<Value> body = std::nullopt;
};

/// The contract's error object.
inline Answer errorAnswer(int status, std::string error, std::string message) {
  return {.status = status, .body = Dictionary{{"error", std::move(error)}, {"error_msg", std::move(message)}}};
}

}  // namespace palisade::sandbox
