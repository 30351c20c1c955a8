#include "Tests/Unit/Memory/FailingAllocations.h"

#include <atomic>
#include <cstdlib>
#include <new>
#include <utility>

namespace palisade {
namespace {

std::atomic<std::size_t> allocations = 0;
std::atomic<std::size_t> firstFailing = 0;
std::atomic<bool> laterOnesFail = false;
std::atomic<bool> hasFailed = false;
std::atomic<void (*)()> nextInterruption = nullptr;
thread_local int scopes = 0;

bool failsNow() {
  if (scopes == 0) return false;
  if (void (*interruption)() = nextInterruption.exchange(nullptr)) {
    const UncountedAllocations uncounted;
    interruption();
  }
  const std::size_t number = ++allocations;
  const bool fails = number == firstFailing || (laterOnesFail && firstFailing > 0 && number > firstFailing);
  if (fails) hasFailed = true;
  return fails;
}

}  // namespace

void planAllocations(const AllocationPlan& plan) {
  allocations = 0;
  firstFailing = plan.failing;
  laterOnesFail = plan.andAllLater;
  hasFailed = false;
}

void interruptNextAllocation(void (*interruption)()) { nextInterruption = interruption; }

bool anAllocationFailed() { return hasFailed; }

CountedAllocations::CountedAllocations() { ++scopes; }
CountedAllocations::~CountedAllocations() { --scopes; }

UncountedAllocations::UncountedAllocations() : _scopesAround(std::exchange(scopes, 0)) {}
UncountedAllocations::~UncountedAllocations() { scopes = _scopesAround; }

namespace {

void* allocated(void* memory) {
  if (memory == nullptr) throw std::bad_alloc();
  return memory;
}

}  // namespace
}  // namespace palisade

// The standard library's other forms of new and delete end in these. In optimised code GCC takes a delete that it has inlined
// for the wrong partner of a new that it has not.

void* operator new(std::size_t size) {
  if (palisade::failsNow()) throw std::bad_alloc();
  return palisade::allocated(std::malloc(size == 0 ? 1 : size));
}

void* operator new(std::size_t size, std::align_val_t alignment) {
  if (palisade::failsNow()) throw std::bad_alloc();
  const auto boundary = static_cast<std::size_t>(alignment);
  return palisade::allocated(std::aligned_alloc(boundary, (size + boundary - 1) / boundary * boundary));
}

[[gnu::noinline]] void operator delete(void* memory) noexcept { std::free(memory); }
[[gnu::noinline]] void operator delete(void* memory, std::size_t) noexcept { std::free(memory); }
[[gnu::noinline]] void operator delete(void* memory, std::align_val_t) noexcept { std::free(memory); }
[[gnu::noinline]] void operator delete(void* memory, std::size_t, std::align_val_t) noexcept { std::free(memory); }
