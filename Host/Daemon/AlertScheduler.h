#pragma once

/// Shows the user one alert at a time, and takes down the alert of an operation that was withdrawn.
///
/// It stands between the plug-ins and the front end that shows alerts. Which operation an alert belongs to is the calling
/// thread's
/// (`Operation::current`).
/// Threads: as `SystemAlert` says; alerts are shown in the order in which they were created. Ownership: borrows the front end.
/// Errors: an alert of a withdrawn operation is never shown and is nobody's answer; so is every word that is neither button's.

#include <condition_variable>
#include <cstdint>
#include <functional>
#include <mutex>
#include <set>

#include "Platform/SystemAlert.h"

namespace palisade {

class AlertScheduler final : public SystemAlert {
 public:
  /// `takeDown` has the front end end the wait for the answer of one of its alerts.
  AlertScheduler(SystemAlert& frontEnd, std::function<void(const std::shared_ptr<AlertHandle>&)> takeDown)
      : _frontEnd(frontEnd),
        _takeDown(std::move(takeDown)) {}

  std::shared_ptr<AlertHandle> createAlert(AlertAllocator allocator, double timeoutSeconds, unsigned flags, int* errorPlace,
                                           const AlertDescription& description) override;
  int receiveResponse(const std::shared_ptr<AlertHandle>& handle, double timeoutSeconds, AlertResponse& response) override;
  void releaseAlert(std::shared_ptr<AlertHandle> handle) override;

 private:
  struct Place;

  void leave(std::uint64_t ticket);

  SystemAlert& _frontEnd;
  std::function<void(const std::shared_ptr<AlertHandle>&)> _takeDown;
  std::mutex _mutex;
  std::condition_variable _hasMoved;
  std::uint64_t _lastTicket = 0;
  /// Alerts that stand or wait, the first of which is the user's.
  std::set<std::uint64_t> _queue;
};

}  // namespace palisade
