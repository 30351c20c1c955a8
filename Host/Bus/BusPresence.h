#pragma once

/// A process that the session bus knows by a name and nobody calls: the bus starts it when it is asked to, once, and it ends
/// with the session.
///
/// Threads: one at a time. Ownership: owns its connection; the name goes with it. Errors: none. Without a session bus, or while
/// another process has the name, there is no presence, and the process does its work all the same.

#include <memory>
#include <string>

namespace sdbus {
class IConnection;
}

namespace palisade {

/// The social daemon's name.
inline constexpr const char* socialDaemonBusName = "com.veltran.Vantad1";

class BusPresence {
 public:
  explicit BusPresence(const std::string& name);
  BusPresence(const BusPresence&) = delete;
  BusPresence& operator=(const BusPresence&) = delete;
  ~BusPresence();

  /// Readable when `serve` has something to do; -1 without a presence.
  int descriptor() const;

  /// Answers what the bus asks every process. False once the session is over.
  bool serve();

 private:
  std::unique_ptr<sdbus::IConnection> _connection;
};

}  // namespace palisade
