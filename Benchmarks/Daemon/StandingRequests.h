#pragma once

/// Another application, whose requests stand at a server that never answers while something else is measured.
///
/// Threads: one. Ownership: ends the other application, which withdraws its requests, and has the server answer again. Errors:
/// `BusCallError` when the requests do not come to stand.

#include <sys/types.h>

namespace palisade {

class StandingRequests {
 public:
  /// Returns when each of them stands or has been refused.
  explicit StandingRequests(int count);
  ~StandingRequests();

  StandingRequests(const StandingRequests&) = delete;
  StandingRequests& operator=(const StandingRequests&) = delete;

  /// How many of them the daemon carries; the others are beyond the bound of one application.
  int standing() const { return _standing; }

 private:
  pid_t _application = -1;
  int _standing = 0;
};

/// What the other application does: `palisade-daemon-benchmark stand COUNT`. It goes on until it is killed.
[[noreturn]] void standAtServer(int count);

}  // namespace palisade
