#pragma once

/// Counts what a program allocates: the program's own `operator new` is replaced by one that counts.
///
/// Threads: every thread has a count of its own. Errors: as the standard's operators.

#include <cstdint>

namespace palisade {

/// How often the calling thread has allocated so far.
std::uint64_t allocationsSoFar();

}  // namespace palisade
