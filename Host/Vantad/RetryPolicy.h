#pragma once

/// How long to leave the server alone after a failure.
///
/// Threads: pure. Ownership: a value. Errors: none.

#include <algorithm>
#include <chrono>
#include <cstdint>
#include <optional>

namespace palisade {

struct RetryPolicy {
  std::chrono::seconds first{5};
  std::chrono::seconds longest{3600};
  /// A server that asks for more gets this much: a mistake of its must not keep a token valid for years.
  std::chrono::seconds longestAsked{24 * 3600};

  /// Twice as long each time, and less than that by up to a half: `random` is from 0 to 1 and keeps clients apart.
  std::chrono::seconds after(std::int64_t failures, double random) const {
    constexpr std::int64_t mostDoublings = 30;
    const std::int64_t doublings = std::clamp<std::int64_t>(failures - 1, 0, mostDoublings);
    const std::chrono::seconds full = std::min(longest, first * (std::int64_t{1} << doublings));
    const auto part = std::chrono::duration_cast<std::chrono::seconds>(full * (1.0 - random / 2));
    return std::max(part, std::chrono::seconds(1));
  }

  std::chrono::seconds asked(std::chrono::seconds retryAfter) const {
    return std::clamp(retryAfter, std::chrono::seconds(1), longestAsked);
  }
};

}  // namespace palisade
