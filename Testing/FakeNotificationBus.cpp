#include "Testing/FakeNotificationBus.h"

#include <utility>

namespace palisade {

struct FakeNotificationBus::Registration : NotificationRegistration {
  Registration(std::string_view notification, std::shared_ptr<SerialQueue> deliveredOn, std::function<void()> called)
      : name(notification),
        queue(std::move(deliveredOn)),
        handler(std::move(called)) {}

  std::string name;
  std::shared_ptr<SerialQueue> queue;
  std::function<void()> handler;
};

void FakeNotificationBus::post(std::string_view name) {
  std::vector<std::weak_ptr<Registration>> registrations;
  {
    const std::lock_guard lock(_mutex);
    registrations = _registrations;
  }
  const FaultInjector::Pause pause;
  for (const auto& each : registrations) {
    const auto registration = each.lock();
    if (registration == nullptr || registration->name != name) continue;
    // Cancelled is cancelled, also when the notification already waits in the queue.
    registration->queue->async([each] {
      if (const auto stillRegistered = each.lock()) stillRegistered->handler();
    });
  }
}

std::shared_ptr<NotificationRegistration> FakeNotificationBus::registerHandler(std::string_view name,
                                                                               std::shared_ptr<SerialQueue> queue,
                                                                               std::function<void()> handler) {
  _instruments.faults.enter("NotificationBus.register");
  {
    const FaultInjector::Pause pause;
    _instruments.trace.record("NotificationBus.register", {{"name", name}, {"queue", queue->label()}});
  }
  auto registration = std::make_shared<Registration>(name, std::move(queue), std::move(handler));
  const std::lock_guard lock(_mutex);
  _registrations.push_back(registration);
  return registration;
}

}  // namespace palisade
