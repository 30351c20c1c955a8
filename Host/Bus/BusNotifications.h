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
  /// Calls `post` if the connection of that unique name may post, as soon as that is known. It is called on the thread that
  /// reads the bus, when the message has been read.
  using Judge = std::function<void(const std::string& uniqueName, std::function<void()> post)>;

  BusNotifications(sdbus::IConnection& connection, Judge judge) : _connection(connection), _judge(std::move(judge)) {}

  std::shared_ptr<NotificationRegistration> registerHandler(std::string_view name, std::shared_ptr<SerialQueue> queue,
                                                            std::function<void()> handler) override;

 private:
  sdbus::IConnection& _connection;
  const Judge _judge;
};

}  // namespace palisade
