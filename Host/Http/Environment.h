#pragma once

/// Makes a process deaf to the environment variables by which whoever starts it could steer its connections: proxies, key logs,
/// other authorities, modules for the TLS library, another resolver.
///
/// Threads: to be called first in `main`, before any other thread exists. Errors: none.

namespace palisade {

void forgetNetworkEnvironment();

}  // namespace palisade
