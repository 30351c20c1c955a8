#pragma once

/// Talks to a running sandbox for its command line.
///
/// Threads: one. Errors: `std::runtime_error` with a sentence for the user when no sandbox answers or it refuses.

#include <string>

#include "Sandbox/Options.h"

namespace palisade::sandbox {

/// What the sandbox answers to the command, as JSON.
std::string askSandbox(const Options& options);

}  // namespace palisade::sandbox
