#pragma once

/// What the end of a helper means. Everything that decides between consent and refusal is here.
///
/// Threads: a pure function. Errors: whatever is not plainly the user's answer is nobody's.

#include <optional>
#include <string_view>

#include "Host/Alert/AlertAnswer.h"
#include "Platform/SystemAlert.h"

namespace palisade {

/// `received` is all that the helper wrote, `waitStatus` how its process ended (waitpid(2)); none when it had to be killed.
/// One of the two buttons was pressed only if the helper wrote exactly one frame, with this nonce, and then exited with 0.
AlertResponse responseOfEnding(std::string_view received, std::optional<int> waitStatus, const AlertNonce& nonce);

}  // namespace palisade
