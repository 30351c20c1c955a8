#pragma once

/// The notification bus on D-Bus: one signal a posted notification (DBus/com.veltran.Notify1.xml). See `NotificationBus`.
///
/// The bus itself filters by name, so a process is woken only for what it registered for. Who has posted is asked before the
/// handler hears of it.
/// Threads: `registerHandler` from any thread; signals arrive on the thread that reads the connection and are handed to the
/// asked queue. Ownership: borrows the connection, which outlives every registration that is not kept for ever.

#include <sdbus-c++/IConnection.h>

#include <functional>
#include <string>
#include <utility>

#include "Platform/NotificationBus.h"

namespace palisade {

class BusNotifications final : public NotificationBus {
 public:
  /// `mayPost` judges the connection of that unique name, on the thread that reads the bus, when the message has been read.
  BusNotifications(sdbus::IConnection& connection, std::function<bool(const std::string& uniqueName)> mayPost)
      : _connection(connection),
        _mayPost(std::move(mayPost)) {}

  std::shared_ptr<NotificationRegistration> registerHandler(std::string_view name, std::shared_ptr<SerialQueue> queue,
                                                            std::function<void()> handler) override;

 private:
  sdbus::IConnection& _connection;
  const std::function<bool(const std::string&)> _mayPost;
};

}  // namespace palisade
