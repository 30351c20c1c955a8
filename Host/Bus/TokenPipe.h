#pragma once

/// Tokens that cross the bus in pipes, so that no message holds them.
///
/// Threads: safe from every thread; reading waits for whoever writes, for seconds at most. Ownership: results are the caller's.
/// Errors: `BusFailure` with a sentence for the caller.

#include <sdbus-c++/Types.h>

#include <string>

namespace palisade {

/// What the descriptor brings until its end. Whoever sends a token has it: one that stays silent for 10 seconds, or brings more
/// than 64 KiB, is refused.
std::string readToEnd(const sdbus::UnixFd& descriptor);

/// A pipe that holds `content` to its end. A token always fits into a pipe's buffer.
sdbus::UnixFd pipeHolding(const std::string& content);

}  // namespace palisade
