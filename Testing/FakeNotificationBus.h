#pragma once

/// A notification bus of one process. See `NotificationBus`. Threads: safe from every thread.

#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <string_view>
#include <vector>

#include "Platform/NotificationBus.h"
#include "Testing/Instruments.h"

namespace palisade {

class FakeNotificationBus final : public NotificationBus {
 public:
  explicit FakeNotificationBus(Instruments instruments) : _instruments(instruments) {}

  /// Posts a notification, as another process does: hands every handler registered for it to its queue. Not traced.
  void post(std::string_view name);

  std::shared_ptr<NotificationRegistration> registerHandler(std::string_view name, std::shared_ptr<SerialQueue> queue,
                                                            std::function<void()> handler) override;

 private:
  struct Registration;

  Instruments _instruments;
  std::mutex _mutex;
  std::vector<std::weak_ptr<Registration>> _registrations;
};

}  // namespace palisade
