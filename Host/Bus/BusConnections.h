#pragma once

/// Every connection to the bus: since when it is known to exist, and which process the bus says has made it.
///
/// The bus announces each new name; the moment at which that is heard is noted in the kernel's own unit for the starts of
/// processes, clock ticks since the machine came up. The connection is a little older than that. Connections that were there
/// before the daemon listened share one moment. What is kept ends with the connection, so the bus's own limits bound it.
/// Threads: every operation may be called from any thread; `madeBy` asks the bus and holds nothing meanwhile, and `awaitEnd`
/// waits. Errors: those of the question.

#include <sys/types.h>

#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <functional>
#include <mutex>
#include <optional>
#include <string>
#include <unordered_map>
#include <vector>

#include "Host/Identity/CallingConnection.h"

namespace palisade {

std::uint64_t clockTicksSinceBoot();

class BusConnections {
 public:
  /// The process that has made a connection; none when there is no such connection any more.
  using AskProcess = std::function<std::optional<pid_t>(const std::string& uniqueName)>;

  explicit BusConnections(AskProcess askProcess, std::function<std::uint64_t()> now = clockTicksSinceBoot)
      : _askProcess(std::move(askProcess)),
        _now(std::move(now)) {}

  /// Names that exist at the beginning; those of services among them are passed over, here and below.
  void wereThere(const std::vector<std::string>& names);
  void appeared(const std::string& name);
  void vanished(const std::string& name);

  struct Connection {
    std::uint64_t existedAt;
    bool isOlderThanDaemon;
    /// What the bus has said; none until it was asked.
    std::optional<pid_t> process = std::nullopt;
    /// When the process started that has made it, once that was found.
    std::optional<std::uint64_t> ownerStart = std::nullopt;

    friend bool operator==(const Connection&, const Connection&) = default;
  };
  /// None for a connection that the bus has not announced, or that is gone.
  std::optional<Connection> find(const std::string& uniqueName) const;

  /// The connections that the bus counts for a process, without those that are known to have existed before `sinceTick`: a
  /// process that started then has not made them. One that has just ended may still be among them.
  std::vector<std::string> madeBy(pid_t process, std::uint64_t sinceTick);

  /// Waits until one of the connections has ended, at most until the deadline. Returns those that have not ended. The thread
  /// that calls `vanished` must not call this.
  std::vector<std::string> awaitEnd(const std::vector<std::string>& uniqueNames,
                                    std::chrono::steady_clock::time_point deadline);

  /// All of these were made by the process that has their number and started at that tick.
  void confirm(const std::vector<std::string>& uniqueNames, std::uint64_t startTick);

 private:
  const AskProcess _askProcess;
  const std::function<std::uint64_t()> _now;
  mutable std::mutex _mutex;
  std::condition_variable _oneHasEnded;
  std::unordered_map<std::string, Connection> _connections;
};

}  // namespace palisade
