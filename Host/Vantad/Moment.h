#pragma once

/// Now, as told by two clocks: the one that people set, for records, and the one that nobody can set, for durations.
///
/// Threads: any. Ownership: values. Errors: none.

#include <chrono>
#include <functional>
#include <optional>
#include <string>

#include "Platform/Date.h"

namespace palisade {

struct Moment {
  Date date;
  /// Which start of the machine `uptime` counts from, sleep included; empty when the kernel does not say.
  std::string boot = {};
  std::chrono::milliseconds uptime{};
};

using Clock = std::function<Moment()>;

Moment presentMoment();

/// The time that has passed from one to the other, at least; none when the machine was started in between, or might have been.
std::optional<std::chrono::milliseconds> elapsed(const Moment& from, const Moment& until);

}  // namespace palisade
