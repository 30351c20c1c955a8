#pragma once

/// Read before each source of this folder when the thread sanitizer is to understand it: GCC's does not see
/// pthread_mutex_clocklock, and takes what is done under a std::timed_mutex for unordered. Without that call the standard
/// library waits for such a lock with one that is seen, on the system's clock.

#include <version>

#undef _GLIBCXX_USE_PTHREAD_MUTEX_CLOCKLOCK
