#include "Host/Bus/SignalSender.h"

#include <utility>

namespace palisade {
namespace {

constexpr const char* busDriver = "org.freedesktop.DBus";
constexpr const char* busDriverPath = "/org/freedesktop/DBus";

}  // namespace

bool isFromBus(const sdbus::Message& message) { return message.getSender() == busDriver; }

NameOwner::NameOwner(sdbus::IConnection& bus, std::string name) : _name(std::move(name)) {
  // First the changes: one that comes while the bus is asked is not missed.
  _changes = bus.addMatch("type='signal',sender='" + std::string(busDriver) + "',interface='" + busDriver +
                              "',member='NameOwnerChanged',arg0='" + _name + "'",
                          [this](sdbus::Message& message) {
                            if (!isFromBus(message)) return;
                            std::string changed;
                            std::string before;
                            std::string now;
                            message >> changed >> before >> now;
                            _owner = now.empty() ? std::nullopt : std::optional(now);
                          });
  _owner = ownerOnBus(bus, _name);
}

bool NameOwner::hasSent(const sdbus::Message& message) const { return _owner && message.getSender() == *_owner; }

std::optional<std::string> ownerOnBus(sdbus::IConnection& bus, const std::string& name) {
  try {
    std::string owner;
    sdbus::createProxy(bus, busDriver, busDriverPath)
        ->callMethod("GetNameOwner")
        .onInterface(busDriver)
        .withArguments(name)
        .storeResultsTo(owner);
    return owner;
  } catch (const sdbus::Error& error) {
    if (error.getName() == "org.freedesktop.DBus.Error.NameHasNoOwner") return std::nullopt;
    throw;
  }
}

}  // namespace palisade
