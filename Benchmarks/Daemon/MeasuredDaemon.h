#pragma once

/// An account daemon that a measurement starts and stops.
///
/// Threads: one. Ownership: ends the process with itself. Errors: `BusCallError` when it does not come up or go away.

#include <sys/types.h>

#include <string>

namespace palisade {

class MeasuredDaemon {
 public:
  /// Starts the program, found along PATH, and returns as soon as it owns its name.
  explicit MeasuredDaemon(const std::string& program);
  ~MeasuredDaemon();

  MeasuredDaemon(const MeasuredDaemon&) = delete;
  MeasuredDaemon& operator=(const MeasuredDaemon&) = delete;

  pid_t process() const { return _process; }

 private:
  pid_t _process = -1;
};

/// Asks a daemon that somebody else started to end, and waits until its name is free.
void stopDaemon(pid_t process);

}  // namespace palisade
