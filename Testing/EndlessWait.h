#pragma once

/// Tells whether a thread sleeps until somebody wakes it, without guessing from the time that has passed.
///
/// The kernel is asked (proc(5)): a thread waits endlessly when it sleeps in a futex wait without a time-out, which is what
/// semaphores, condition variables, futures and mutexes come down to. A thread that ends does not wait. It takes no privilege.
/// Threads: safe from every thread. Errors: `std::runtime_error` when the kernel does not tell: there is no proc(5), or the
/// process is closed to its own user (`PR_SET_DUMPABLE`).

#include <optional>
#include <string>

#include <sys/types.h>

namespace palisade {

/// None when the thread does anything else. Otherwise a text that differs as soon as the thread has run in between: two equal
/// answers mean that it slept all the time from the one to the other.
std::optional<std::string> endlessWaitOf(pid_t thread);

}  // namespace palisade
