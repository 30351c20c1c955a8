#pragma once

/// Overwrites secrets with zeros where the compiler would leave a plain write out.
///
/// Threads: safe from every thread on memory of the caller's own. Errors: none.

#include <cstddef>
#include <string>

namespace palisade {

void wipe(void* memory, std::size_t size) noexcept;

/// Wipes what functions that have returned left of themselves on the calling thread's stack, as deep as any of ours and of the
/// libraries reaches. Between two pieces of work, in the function that calls for them: libraries keep parts of what they move
/// in local variables and saved registers, and nothing else overwrites those until the next work does.
void wipeDeadStack() noexcept;

/// Wipes the whole capacity of the text, which is empty afterwards.
void wipe(std::string& text) noexcept;

}  // namespace palisade
