#pragma once

/// How long a wait may take, in the forms in which it is asked for and waited with.
///
/// Threads: pure functions, but for the clock.

#include <algorithm>
#include <chrono>
#include <limits>

namespace palisade {

using Deadline = std::chrono::steady_clock::time_point;

/// After so many seconds; 0 is never.
inline Deadline deadlineAfter(double seconds) {
  if (seconds <= 0) return Deadline::max();
  return std::chrono::steady_clock::now() + std::chrono::ceil<Deadline::duration>(std::chrono::duration<double>(seconds));
}

/// For poll(2): -1 waits for ever.
inline int millisecondsLeft(Deadline deadline) {
  if (deadline == Deadline::max()) return -1;
  const auto left = std::chrono::ceil<std::chrono::milliseconds>(deadline - std::chrono::steady_clock::now()).count();
  return static_cast<int>(std::clamp<decltype(left)>(left, 0, std::numeric_limits<int>::max()));
}

}  // namespace palisade
