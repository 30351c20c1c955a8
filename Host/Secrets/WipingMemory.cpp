#include "Host/Secrets/WipingMemory.h"

#include <malloc.h>

#include <algorithm>
#include <cstdlib>
#include <cstring>

namespace palisade {

extern "C" {

void* wipingMalloc(std::size_t size) { return std::malloc(size); }

void* wipingCalloc(std::size_t count, std::size_t size) { return std::calloc(count, size); }

// Never lets the C library move the block: that would leave the old copy behind.
void* wipingRealloc(void* memory, std::size_t size) {
  if (memory == nullptr) return std::malloc(size);
  if (size == 0) {
    wipingFree(memory);
    return nullptr;
  }
  void* const larger = std::malloc(size);
  if (larger == nullptr) return nullptr;
  std::memcpy(larger, memory, std::min(size, ::malloc_usable_size(memory)));
  wipingFree(memory);
  return larger;
}

char* wipingStrdup(const char* text) {
  const std::size_t size = std::strlen(text) + 1;
  auto* const copy = static_cast<char*>(std::malloc(size));
  if (copy != nullptr) std::memcpy(copy, text, size);
  return copy;
}

void wipingFree(void* memory) {
  if (memory == nullptr) return;
  ::explicit_bzero(memory, ::malloc_usable_size(memory));
  std::free(memory);
}

void* wipingMallocAt(std::size_t size, const char*, int) { return wipingMalloc(size); }
void* wipingReallocAt(void* memory, std::size_t size, const char*, int) { return wipingRealloc(memory, size); }
void wipingFreeAt(void* memory, const char*, int) { wipingFree(memory); }

}  // extern "C"

}  // namespace palisade
