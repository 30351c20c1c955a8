#pragma once

/// Overwrites secrets with zeros where the compiler would leave a plain write out.
///
/// Threads: safe from every thread on memory of the caller's own. Errors: none.

#include <cstddef>
#include <string>

namespace palisade {

void wipe(void* memory, std::size_t size) noexcept;

/// Wipes the whole capacity of the text, which is empty afterwards.
void wipe(std::string& text) noexcept;

}  // namespace palisade
