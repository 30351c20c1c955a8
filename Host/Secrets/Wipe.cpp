#include "Host/Secrets/Wipe.h"

#include <cstring>

namespace palisade {

void wipe(void* memory, std::size_t size) noexcept { ::explicit_bzero(memory, size); }

void wipe(std::string& text) noexcept {
  // Within its capacity a string grows without moving.
  text.resize(text.capacity());
  wipe(text.data(), text.size());
  text.clear();
}

}  // namespace palisade
