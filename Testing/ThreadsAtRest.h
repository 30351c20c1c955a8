#pragma once

/// Tells whether every thread of the process waits for something that none of them will bring about.
///
/// Purpose: a scripted platform has to know when an operation waits for the server or the user, and when it waits for ever,
/// without guessing from the time that has passed. It asks the kernel (proc(5)): a thread is at rest when it sleeps in a futex
/// wait without a time-out, and stays so between two looks at all of them.
/// Threads: the caller's thread and those that ran when the object was made are not watched; everything that a plug-in or a
/// fake starts later is. A thread that waits in another way, or with a time-out, is not at rest.
/// Errors: `std::runtime_error` when the kernel does not tell.

#include <set>

#include <sys/types.h>

namespace palisade {

class ThreadsAtRest {
 public:
  ThreadsAtRest();

  bool now() const;

 private:
  std::set<pid_t> _unwatched;
};

}  // namespace palisade
