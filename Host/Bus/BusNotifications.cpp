#include "Host/Bus/BusNotifications.h"

#include <sdbus-c++/sdbus-c++.h>

#include <string>

#include "Host/Bus/BusLoop.h"

namespace palisade {
namespace {

class Registration final : public NotificationRegistration {
 public:
  explicit Registration(sdbus::Slot match) : _match(std::move(match)) {}

 private:
  sdbus::Slot _match;
};

// A match rule's values stand in apostrophes, which a value itself writes as '\'', as in a shell.
std::string quoted(std::string_view text) {
  std::string result = "'";
  for (const char character : text) {
    if (character == '\'') {
      result += "'\\''";
    } else {
      result += character;
    }
  }
  return result + "'";
}

}  // namespace

std::shared_ptr<NotificationRegistration> BusNotifications::registerHandler(std::string_view name,
                                                                            std::shared_ptr<SerialQueue> queue,
                                                                            std::function<void()> handler) {
  const std::string rule = "type='signal',interface='com.veltran.Notify1',member='Posted',arg0=" + quoted(name);
  // A signal that is sent straight to this connection has passed no rule of the bus's.
  return std::make_shared<Registration>(
      _connection.addMatch(rule, [this, queue = std::move(queue), handler = std::move(handler)](sdbus::Message& message) {
        BusLoop::defer([this, queue, handler, poster = message.getSender()] {
          _judge(poster, [queue, handler] { queue->async(handler); });
        });
      }));
}

}  // namespace palisade
