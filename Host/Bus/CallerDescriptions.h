#pragma once

/// Describes connections to the bus for whoever identifies the process behind one.
///
/// Threads: `processOf` and `describe` may be called from any thread and wait for the bus, as the functions of a description
/// do; the rest is for the thread that reads the bus, and waits for nothing. Ownership: a description borrows this object.
/// Errors: those of BusQuestions.h; a connection that the bus has not announced is a `BusFailure`.

#include <mutex>
#include <optional>
#include <string>

#include "Host/Bus/BusConnections.h"
#include "Host/Bus/BusQuestions.h"
#include "Host/Identity/CallingConnection.h"

namespace palisade {

class CallerDescriptions {
 public:
  explicit CallerDescriptions(std::string busAddress);

  /// Takes note of the connections that exist, once the bus announces new ones. Waits for the bus.
  void begin();

  void appeared(const std::string& name) { _connections.appeared(name); }
  void vanished(const std::string& name) { _connections.vanished(name); }

  /// The process that has made the connection. Waits for the bus.
  pid_t processOf(const std::string& uniqueName);

  CallingConnection describe(const std::string& uniqueName);

 private:
  const std::string _busAddress;
  BusQuestions _questions;
  BusConnections _connections;
  pid_t _busProcess = 0;
};

}  // namespace palisade
