#pragma once

/// The system notification bus: named notifications without content, posted by any process of the user.
///
/// Threads: `registerHandler` may be called from any thread; the handler runs on the queue that was asked for.
/// Ownership: a registration is an owned token; destroying it cancels. It keeps the queue alive.
/// Errors: a registration that cannot be made is an exception; the token is never null.

#include <functional>
#include <memory>
#include <string_view>

#include "Platform/SerialQueue.h"

namespace palisade {

class NotificationRegistration {
 public:
  virtual ~NotificationRegistration() = default;
};

class NotificationBus {
 public:
  virtual ~NotificationBus() = default;

  /// Has `handler` called on `queue` each time `name` is posted from now on.
  virtual std::shared_ptr<NotificationRegistration> registerHandler(std::string_view name, std::shared_ptr<SerialQueue> queue,
                                                                    std::function<void()> handler) = 0;
};

}  // namespace palisade
