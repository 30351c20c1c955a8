#pragma once

/// What the daemon can say about its surroundings only by trying them.
///
/// Threads: any; waits for as long as `longestWaitForServer`. Errors: none. What
/// is wrong is a sentence that says what to do; none when all is well.

#include <chrono>
#include <optional>
#include <string>

#include "Host/Social/ServerConfiguration.h"

namespace palisade {

inline constexpr std::chrono::seconds longestWaitForServer(10);

/// Whether the server can be reached over TLS and answers; what it answers does not matter. No token is sent.
std::optional<std::string> troubleWithServer(const ServerConfiguration& server);

}  // namespace palisade
