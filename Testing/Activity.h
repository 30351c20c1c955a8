#pragma once

/// What one thread of the scripted platform has to do, so that it can be told when nothing in the process moves any more.
///
/// Whoever hands work to a thread says `begin` first; `end` is said when the work is done and the thread holds nothing that
/// another one might wait for. Starting and ending a thread count as work too. At rest is a process in which every thread that
/// has something to do waits endlessly: nothing happens any more until the caller does something. Threads that a test or a
/// plug-in starts itself are not seen.
/// Threads: safe from every thread. Errors: see `endlessWaitOf`.

#include <cstddef>

#include <sys/types.h>

namespace palisade {

class Activity {
 public:
  Activity();
  ~Activity();

  Activity(const Activity&) = delete;
  Activity& operator=(const Activity&) = delete;

  /// One more thing to do, and one less.
  void begin();
  void end();

  /// Said by the thread itself, once.
  void runsHere();

  static bool everythingRests();

 private:
  friend struct ActivityRegistry;

  pid_t _thread = 0;
  std::size_t _toDo = 0;
};

}  // namespace palisade
