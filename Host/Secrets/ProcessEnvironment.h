#pragma once

/// Leaves a process the environment variables that it needs, and no others: whoever starts it could steer it with the rest.
/// Proxies, key logs, other authorities and modules for the TLS library, another resolver, modules for character sets, GIO and
/// GTK, and the dynamic loader's own variables for the programs that it starts.
///
/// What the loader has done before `main` is done: this takes nothing back that a library was preloaded for.
/// Threads: to be called first in `main`, before any other thread exists. Errors: `std::bad_alloc`.

namespace palisade {

void keepKnownEnvironment();

}  // namespace palisade
