#pragma once

/// Finds out which application is behind each caller, away from the thread that reads the bus.
///
/// That takes a look at the disk on which the caller's program stands, and which disk that is, is the caller's choice. So the
/// calls of a connection wait until one of them has had it found out, one connection of a process at a time is looked at, and
/// nobody else waits for these. Threads: `whenKnown` is called by the thread that reads the bus, which also runs what it is
/// given. Ownership: owns the calls that wait; borrows the service and the loop. Errors: a caller that cannot be identified, or
/// has too many calls waiting, is refused.

#include <sys/types.h>

#include <cstddef>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <variant>
#include <vector>

#include "Host/Bus/AccountsService.h"
#include "Host/Bus/WaitingCalls.h"

namespace palisade {

class BusLoop;

class CallerApplications {
 public:
  /// So many calls of a connection may wait until it is known.
  static constexpr std::size_t mostWaiting = 100;

  struct Parts {
    AccountsService& service;
    BusLoop& loop;
    /// The process that has made a connection; waits for the bus.
    std::function<pid_t(const std::string& uniqueName)> processOf;
    /// Whether the connection still exists.
    std::function<bool(const std::string& uniqueName)> isHere;
  };

  explicit CallerApplications(Parts parts) : _parts(std::move(parts)) {}

  using GoOn = std::function<void(const std::string& application)>;
  using Refuse = std::function<void(const BusFailure& failure)>;

  /// Calls `goOn` now if the application is known; else, unless the caller leaves meanwhile, one of the two when it is.
  void whenKnown(const std::shared_ptr<const BusCaller>& caller, const GoOn& goOn, const Refuse& refuse);

 private:
  struct Call {
    GoOn goOn;
    Refuse refuse;
  };
  using CallerRef = std::shared_ptr<const BusCaller>;
  using Finding = std::variant<std::string, BusFailure>;

  using Step = void (CallerApplications::*)(const CallerRef& caller);

  bool isFirstToWait(const BusCaller& caller, Call call);
  void inLine(WaitingCalls& lines, const std::string& name, const CallerRef& caller, Step step);
  void findProcess(const CallerRef& caller);
  void identify(const CallerRef& caller);
  void tell(const CallerRef& caller, const Finding& finding);

  const Parts _parts;
  // Each connection stands in these once, so their number is the bus's care.
  WaitingCalls _newcomers{1, WaitingCalls::unbounded};
  WaitingCalls _identifications{1, WaitingCalls::unbounded};
  std::mutex _mutex;
  std::map<std::string, std::vector<Call>> _waiting;  // by connection, under the mutex
};

}  // namespace palisade
