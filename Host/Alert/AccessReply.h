#pragma once

/// What a portal's reply means. Everything that decides whether it is consent is here.
///
/// Where the keyboard stands in a portal's dialog, and when its keys press a button, is the backend's choice: a key that was
/// meant for another window may have refused. So a refusal there is nobody's answer: the request fails, and nothing is
/// remembered. Threads: a pure function. Errors: whatever is not plainly consent is nobody's answer.

#include <chrono>
#include <cstdint>
#include <optional>

#include "Platform/SystemAlert.h"

namespace palisade {

/// A well-formed reply of the backend that was asked to the very call that asked it.
struct AccessReply {
  std::uint32_t response = 2;
  /// How long the backend had the question, at least.
  std::chrono::steady_clock::duration after{};
};

/// Nobody reads a question and decides in less.
inline constexpr std::chrono::milliseconds soonestConsent(500);

/// 0 is consent, unless it came sooner than a person could have read the question. Every other word, and no reply, is nobody's
/// answer.
AlertResponse responseOfReply(const std::optional<AccessReply>& reply);

}  // namespace palisade
