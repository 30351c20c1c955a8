#include "Benchmarks/CountedAllocations.h"

#include <cstdlib>
#include <new>

namespace {

thread_local std::uint64_t allocations = 0;

}  // namespace

// The other forms of the operators, for arrays and without exceptions, call these two.

void* operator new(std::size_t size) {
  ++allocations;
  if (void* const memory = std::malloc(size == 0 ? 1 : size)) return memory;
  throw std::bad_alloc();
}

void operator delete(void* memory) noexcept { std::free(memory); }

void operator delete(void* memory, std::size_t) noexcept { std::free(memory); }

namespace palisade {

std::uint64_t allocationsSoFar() { return allocations; }

}  // namespace palisade
