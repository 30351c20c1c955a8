#pragma once

/// Shows the user one alert at a time, and takes down the alert of an operation that was withdrawn.
///
/// It stands between the plug-ins and the front end that shows alerts. Which operation an alert belongs to is the calling
/// thread's (`Operation::current`); whose application cools down, or who comes when too many alerts wait already, is not shown
/// to the user, and the operation fails with a sentence that says so.
/// Threads: as `SystemAlert` says; alerts are shown in the order in which they were created. Ownership: borrows the front end,
/// the cool-down and the log. Errors: an alert of a withdrawn operation is never shown and is nobody's answer; so is every word
/// that is neither button's. A front end says ECANCELED when it took the alert down because the session locked: the application
/// can do nothing about that, so it does not count towards its cool-down.

#include <condition_variable>
#include <cstdint>
#include <functional>
#include <mutex>
#include <set>

#include "Host/Daemon/AlertCoolDown.h"
#include "Platform/Log.h"
#include "Platform/SystemAlert.h"

namespace palisade {

class Operation;

class AlertScheduler final : public SystemAlert {
 public:
  /// So many alerts may wait behind the one that stands.
  static constexpr std::size_t mostWaiting = 8;

  /// `takeDown` has the front end end the wait for the answer of one of its alerts.
  AlertScheduler(SystemAlert& frontEnd, std::function<void(const std::shared_ptr<AlertHandle>&)> takeDown,
                 AlertCoolDown& coolDown, Log& log)
      : _frontEnd(frontEnd),
        _takeDown(std::move(takeDown)),
        _coolDown(coolDown),
        _log(log) {}

  std::shared_ptr<AlertHandle> createAlert(AlertAllocator allocator, double timeoutSeconds, unsigned flags, int* errorPlace,
                                           const AlertDescription& description) override;
  int receiveResponse(const std::shared_ptr<AlertHandle>& handle, double timeoutSeconds, AlertResponse& response) override;
  void releaseAlert(std::shared_ptr<AlertHandle> handle) override;

  /// The operation has kept the keychain or the server busy for an alert that never came to stand. For its application that
  /// counts like an alert without an answer: otherwise it could do so for ever.
  void noteUnshown(const Operation& operation) { note(&operation, AlertEnding::unanswered); }

 private:
  struct Place;

  /// A place at the end of the queue, or null when the operation's alert is not to be shown, with which it has then failed.
  std::shared_ptr<Place> queueUp(Operation* operation);
  void waitForTurn(const Place& place, Operation* operation);
  void leave(std::uint64_t ticket);
  void note(const Operation* operation, AlertEnding ending);

  SystemAlert& _frontEnd;
  std::function<void(const std::shared_ptr<AlertHandle>&)> _takeDown;
  AlertCoolDown& _coolDown;
  Log& _log;
  std::mutex _mutex;
  std::condition_variable _hasMoved;
  std::uint64_t _lastTicket = 0;
  /// Alerts that stand or wait, the first of which is the user's.
  std::set<std::uint64_t> _queue;
};

}  // namespace palisade
