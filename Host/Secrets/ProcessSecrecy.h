#pragma once

/// Keeps the memory of a process that holds tokens to itself.
///
/// Threads: once, at start, before there are others. Errors: `std::system_error` when the kernel refuses; a process that was to
/// hold tokens then ends.

namespace palisade {

/// No core dumps, and no other process of the same user may attach to this one or read its memory. Holds until the process
/// executes another program. `/proc/self` belongs to root from then on.
void dropDumpable();

}  // namespace palisade
