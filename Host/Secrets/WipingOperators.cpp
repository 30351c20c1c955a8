// Replaces operator new and operator delete, in every form, for the process that this file is linked into: what C++ gives back
// is wiped first. Tokens live in strings that are copied, grown and dropped in many places, by libraries too; wiping here
// reaches all of them.
//
// Every form is replaced, not only the two that the others default to: a sanitizer's run-time brings its own set, and a block
// must be made and given back by one set. Blocks come from malloc, so the size of one can be asked for.

#include <malloc.h>

#include <algorithm>
#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <new>

namespace {

constexpr std::align_val_t ordinaryAlignment{alignof(std::max_align_t)};

void* allocateOrNull(std::size_t size, std::align_val_t alignment) noexcept {
  size = std::max<std::size_t>(size, 1);
  if (alignment <= ordinaryAlignment) return std::malloc(size);
  void* memory = nullptr;
  return ::posix_memalign(&memory, static_cast<std::size_t>(alignment), size) == 0 ? memory : nullptr;
}

void* allocate(std::size_t size, std::align_val_t alignment = ordinaryAlignment) {
  for (;;) {
    if (void* const memory = allocateOrNull(size, alignment)) return memory;
    const std::new_handler handler = std::get_new_handler();
    if (handler == nullptr) throw std::bad_alloc();
    handler();
  }
}

void* allocateQuietly(std::size_t size, std::align_val_t alignment = ordinaryAlignment) noexcept {
  try {
    return allocate(size, alignment);
  } catch (const std::bad_alloc&) {
    return nullptr;
  }
}

void wipeAndFree(void* memory) noexcept {
  if (memory == nullptr) return;
  ::explicit_bzero(memory, ::malloc_usable_size(memory));
  std::free(memory);
}

}  // namespace

void* operator new(std::size_t size) { return allocate(size); }
void* operator new[](std::size_t size) { return allocate(size); }
void* operator new(std::size_t size, std::align_val_t alignment) { return allocate(size, alignment); }
void* operator new[](std::size_t size, std::align_val_t alignment) { return allocate(size, alignment); }
void* operator new(std::size_t size, const std::nothrow_t&) noexcept { return allocateQuietly(size); }
void* operator new[](std::size_t size, const std::nothrow_t&) noexcept { return allocateQuietly(size); }
void* operator new(std::size_t size, std::align_val_t alignment, const std::nothrow_t&) noexcept {
  return allocateQuietly(size, alignment);
}
void* operator new[](std::size_t size, std::align_val_t alignment, const std::nothrow_t&) noexcept {
  return allocateQuietly(size, alignment);
}

void operator delete(void* memory) noexcept { wipeAndFree(memory); }
void operator delete[](void* memory) noexcept { wipeAndFree(memory); }
void operator delete(void* memory, std::size_t) noexcept { wipeAndFree(memory); }
void operator delete[](void* memory, std::size_t) noexcept { wipeAndFree(memory); }
void operator delete(void* memory, std::align_val_t) noexcept { wipeAndFree(memory); }
void operator delete[](void* memory, std::align_val_t) noexcept { wipeAndFree(memory); }
void operator delete(void* memory, std::size_t, std::align_val_t) noexcept { wipeAndFree(memory); }
void operator delete[](void* memory, std::size_t, std::align_val_t) noexcept { wipeAndFree(memory); }
void operator delete(void* memory, const std::nothrow_t&) noexcept { wipeAndFree(memory); }
void operator delete[](void* memory, const std::nothrow_t&) noexcept { wipeAndFree(memory); }
void operator delete(void* memory, std::align_val_t, const std::nothrow_t&) noexcept { wipeAndFree(memory); }
void operator delete[](void* memory, std::align_val_t, const std::nothrow_t&) noexcept { wipeAndFree(memory); }
