#pragma once

/// Tokens that cross the bus in pipes, so that no message holds them.
///
/// Threads: safe from every thread; reading waits for whoever writes, for seconds at most. Ownership: results are the caller's.
/// Errors: `BusFailure` with a sentence for the caller.

#include <sdbus-c++/Types.h>

#include <chrono>
#include <string>

namespace palisade {

/// What a pipe brings until its end. Whoever sends a token has it: what is no pipe, is still open when the limit is over, or
/// brings more than 64 KiB is refused, and holds the thread no longer whatever its sender does to it.
std::string readToEnd(const sdbus::UnixFd& descriptor, std::chrono::milliseconds limit = std::chrono::seconds{10});

/// A pipe that holds `content` to its end. A token always fits into a pipe's buffer.
sdbus::UnixFd pipeHolding(const std::string& content);

}  // namespace palisade
