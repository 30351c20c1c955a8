#pragma once

/// The file in which Flatpak tells a sandbox whose it is: `/.flatpak-info`, at the root of the sandbox.
///
/// Threads: pure function. Errors: `IdentityError`. Once the file is there the caller is sandboxed, so a file that does not
/// name an application refuses instead of leaving the answer to weaker evidence.

#include <string>
#include <string_view>

namespace palisade {

/// The ID of the application that the sandbox was made for.
std::string flatpakApplicationID(std::string_view info);

}  // namespace palisade
