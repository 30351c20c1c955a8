#pragma once

/// What the bus says about the connection that a call came on: all that a caller is identified by, before the kernel is asked.
///
/// Threads: a value for one look-up; the functions ask the bus, and wait for it. Ownership: shares the descriptor. Errors: the
/// functions throw when the connection is gone or the bus does not answer.

#include <sys/types.h>

#include <chrono>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "Host/Files/FileDescriptor.h"

namespace palisade {

struct CallingConnection {
  /// The number and the user of the process that made the connection, as they were at that moment.
  pid_t process = 0;
  uid_t user = 0;
  /// That process, pinned by the bus since then; null when the bus pins none.
  std::shared_ptr<const FileDescriptor> pin = nullptr;
  /// What the security module called that process; none when the bus does not say.
  std::optional<std::string> securityLabel = std::nullopt;

  /// The process that holds the bus.
  pid_t busProcess = 0;
  /// The bus's end of the daemon's own connection, as getpeername(2) tells it: a path, or a name behind a NUL.
  std::string busAddress = {};

  /// A moment at which the connection existed already, in clock ticks since the machine came up.
  std::uint64_t existedAt = 0;
  /// Whether it existed before the daemon listened, so that nobody knows for how long.
  bool isOlderThanDaemon = false;

  /// The number of the connection's process once more; throws when the connection is gone.
  std::function<pid_t()> askProcessAgain = nullptr;
  /// The connections that the bus counts for this process, without those that are known to have existed before that tick.
  /// One that has just ended may still be among them.
  std::function<std::vector<std::string>(std::uint64_t sinceTick)> listConnections = nullptr;
  /// Waits until one of the connections has ended, at most until the deadline. Returns those that have not ended.
  std::function<std::vector<std::string>(const std::vector<std::string>& connections,
                                         std::chrono::steady_clock::time_point deadline)>
      awaitEnd = nullptr;

  /// When the process started that was found to have made this connection; none before that is found.
  std::optional<std::uint64_t> ownerStart = std::nullopt;
  /// Takes note of it for several connections: a crowd of one process is examined once.
  std::function<void(const std::vector<std::string>& connections, std::uint64_t startTick)> confirm = nullptr;
};

}  // namespace palisade
