#pragma once

/// Who sent a signal. A match rule's `sender` keeps out what is broadcast by others, but not what is sent straight to this
/// connection: the bus delivers that without asking the rules, and the library knows no other names than unique ones. So every
/// handler whose signal means something asks here as well.

#include <sdbus-c++/sdbus-c++.h>

#include <optional>
#include <string>

namespace palisade {

/// Whether the bus itself sent the message.
bool isFromBus(const sdbus::Message& message);

/// Follows who owns a name on a bus.
///
/// Threads: made before the connection's loop runs; afterwards used by the thread that runs it. Ownership: borrows the
/// connection, which outlives it. Errors: a bus that does not answer is an `sdbus::Error` of the constructor.
class NameOwner {
 public:
  NameOwner(sdbus::IConnection& bus, std::string name);
  NameOwner(const NameOwner&) = delete;
  NameOwner& operator=(const NameOwner&) = delete;

  /// Whether the name's owner sent the message. Nobody did while the name has no owner.
  bool hasSent(const sdbus::Message& message) const;

 private:
  std::string _name;
  std::optional<std::string> _owner;
  sdbus::Slot _changes;
};

/// The unique name of whoever owns the name; none when nobody does. Waits for the bus.
std::optional<std::string> ownerOnBus(sdbus::IConnection& bus, const std::string& name);

}  // namespace palisade
