#pragma once

/// Points in time as the platform stores them: whole seconds since the Unix epoch, UTC.

#include <chrono>

namespace palisade {

using Date = std::chrono::sys_seconds;

/// Later than every real date: a credential with this expiry is treated as never expiring. It is the last second that ISO 8601
/// writes with four digits of year, so every store can hold it as text.
inline constexpr Date distantFuture = std::chrono::sys_days{std::chrono::year{9999} / std::chrono::December / 31} +
                                      std::chrono::hours{24} - std::chrono::seconds{1};

}  // namespace palisade
