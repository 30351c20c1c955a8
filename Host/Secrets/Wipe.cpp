#include "Host/Secrets/Wipe.h"

#include <cstring>

namespace palisade {

void wipe(void* memory, std::size_t size) noexcept { ::explicit_bzero(memory, size); }

[[gnu::noinline]] void wipeDeadStack() noexcept {
  char dead[128 * 1024];
  wipe(dead, sizeof dead);
}

void wipe(std::string& text) noexcept {
  // Within its capacity a string grows without moving.
  text.resize(text.capacity());
  wipe(text.data(), text.size());
  text.clear();
}

}  // namespace palisade
