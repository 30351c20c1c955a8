#include "Host/Bus/BusNotifications.h"

#include <sdbus-c++/sdbus-c++.h>

#include <string>

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
  return std::make_shared<Registration>(_connection.addMatch(
      rule, [queue = std::move(queue), handler = std::move(handler)](sdbus::Message&) { queue->async(handler); }));
}

}  // namespace palisade
