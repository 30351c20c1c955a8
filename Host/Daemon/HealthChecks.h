#pragma once

/// What the daemon can say about its surroundings only by trying them.
///
/// Threads: any; both wait, the keychain for seconds and the server for as long as `longestWaitForServer`. Errors: none. What
/// is wrong is a sentence that says what to do; none when all is well.

#include <chrono>
#include <optional>
#include <string>

#include "Host/Keychain/Keychain.h"
#include "Host/Social/ServerConfiguration.h"

namespace palisade {

inline constexpr std::chrono::seconds longestWaitForServer(10);

/// Whether the keychain can be read.
std::optional<std::string> troubleWithKeychain(Keychain& keychain);

/// Whether the server can be reached over TLS and answers; what it answers does not matter. No token is sent.
std::optional<std::string> troubleWithServer(const ServerConfiguration& server);

}  // namespace palisade
