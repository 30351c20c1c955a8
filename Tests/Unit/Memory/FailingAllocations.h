#pragma once

/// Makes memory run out at a chosen moment: this program's `operator new` fails where a test says so.
///
/// Only allocations of threads on which a `CountedAllocations` lives count and fail, all threads' together. Threads: the plan
/// is made by one thread while no other one counts; counting is safe from every thread. Errors: a failing allocation throws
/// `std::bad_alloc`.

#include <cstddef>

namespace palisade {

/// Which of the counted allocations fail, the first being number 1.
struct AllocationPlan {
  std::size_t failing = 0;
  bool andAllLater = false;
};

/// Starts counting anew.
void planAllocations(const AllocationPlan& plan);

/// Calls `interruption` inside the next counted allocation, as if another thread came first there.
void interruptNextAllocation(void (*interruption)());

/// Whether an allocation has failed since the plan was made.
bool anAllocationFailed();

/// The calling thread's allocations count while one lives.
class CountedAllocations {
 public:
  CountedAllocations();
  ~CountedAllocations();

  CountedAllocations(const CountedAllocations&) = delete;
  CountedAllocations& operator=(const CountedAllocations&) = delete;
};

/// They do not count while one lives: somebody else's work on that thread.
class UncountedAllocations {
 public:
  UncountedAllocations();
  ~UncountedAllocations();

  UncountedAllocations(const UncountedAllocations&) = delete;
  UncountedAllocations& operator=(const UncountedAllocations&) = delete;

 private:
  int _scopesAround;
};

}  // namespace palisade
