#include "Host/Bus/BusPresence.h"

#include <sdbus-c++/sdbus-c++.h>

namespace palisade {

BusPresence::BusPresence(const std::string& name) {
  try {
    _connection = sdbus::createSessionBusConnection();
    _connection->requestName(name);
  } catch (const sdbus::Error&) {
    _connection.reset();
  }
}

BusPresence::~BusPresence() = default;

int BusPresence::descriptor() const { return _connection == nullptr ? -1 : _connection->getEventLoopPollData().fd; }

bool BusPresence::serve() {
  if (_connection == nullptr) return true;
  try {
    while (_connection->processPendingRequest()) {
    }
    return true;
  } catch (const sdbus::Error&) {
    _connection.reset();
    return false;
  }
}

}  // namespace palisade
