#include "Host/Bus/SessionLock.h"

#include <sdbus-c++/sdbus-c++.h>
#include <unistd.h>

#include <map>
#include <stdexcept>
#include <string>
#include <thread>

#include "Host/Bus/SignalSender.h"

namespace palisade {
namespace {

using NameOwners = std::vector<std::unique_ptr<NameOwner>>;

constexpr const char* logins = "org.freedesktop.login1";
constexpr const char* loginSession = "org.freedesktop.login1.Session";

// What a login manager says of a session: its ID, its user's number and name, its seat, its object.
using LoginSession = sdbus::Struct<std::string, std::uint32_t, std::string, std::string, sdbus::ObjectPath>;

std::vector<LoginSession> loginSessions(sdbus::IConnection& bus) {
  const auto manager = sdbus::createProxy(bus, logins, "/org/freedesktop/login1");
  std::vector<LoginSession> sessions;
  manager->callMethod("ListSessions").onInterface("org.freedesktop.login1.Manager").storeResultsTo(sessions);
  return sessions;
}

// What a handler cannot read is no lock, and neither is what somebody else says than whoever knows.
template <typename Read>
sdbus::message_handler whenLocked(const std::function<void()>& onLock, const NameOwner& knower, Read isLock) {
  return [&onLock, &knower, isLock](sdbus::Message& message) {
    if (!knower.hasSent(message)) return;
    bool isLocked = false;
    try {
      isLocked = isLock(message);
    } catch (const sdbus::Error&) {
      return;
    }
    if (isLocked) onLock();
  };
}

bool becomesActive(sdbus::Message& message) {
  bool isActive = false;
  message >> isActive;
  return isActive;
}

bool saysItIsLocked(sdbus::Message& message) {
  std::string interface;
  std::map<std::string, sdbus::Variant> changed;
  message >> interface >> changed;
  const auto hint = changed.find("LockedHint");
  return interface == loginSession && hint != changed.end() && hint->second.get<bool>();
}

}  // namespace

// Reads a bus until it is destroyed or the bus is gone.
class SessionLock::Listener {
 public:
  Listener(std::unique_ptr<sdbus::IConnection> bus, NameOwners knowers)
      : _bus(std::move(bus)),
        _knowers(std::move(knowers)),
        _thread([this] { read(); }) {}
  Listener(const Listener&) = delete;
  Listener& operator=(const Listener&) = delete;
  ~Listener() {
    _bus->leaveEventLoop();
    _thread.join();
  }

 private:
  void read() {
    try {
      _bus->enterEventLoop();
    } catch (const sdbus::Error&) {
      // A bus that is gone tells of no more locks.
      return;
    }
  }

  std::unique_ptr<sdbus::IConnection> _bus;
  NameOwners _knowers;
  std::thread _thread;
};

SessionLock::SessionLock(std::function<void()> onLock) : _onLock(std::move(onLock)) {
  for (const auto listen : {&SessionLock::listenToScreenSaver, &SessionLock::listenToLogins}) {
    try {
      (this->*listen)();
    } catch (const sdbus::Error&) {
      continue;
    }
  }
  if (_listeners.empty()) throw std::runtime_error("Neither the session bus nor the system bus tells of locks.");
}

SessionLock::~SessionLock() = default;

// Screen savers differ in where their object is; what they say is the same, and each owns the name of its interface.
void SessionLock::listenToScreenSaver() {
  auto bus = sdbus::createSessionBusConnection();
  NameOwners savers;
  for (const std::string saver : {"org.freedesktop.ScreenSaver", "org.gnome.ScreenSaver"}) {
    savers.push_back(std::make_unique<NameOwner>(*bus, saver));
    bus->addMatch("type='signal',sender='" + saver + "',member='ActiveChanged',interface='" + saver + "'",
                  whenLocked(_onLock, *savers.back(), becomesActive), sdbus::floating_slot);
  }
  _listeners.push_back(std::make_unique<Listener>(std::move(bus), std::move(savers)));
}

// `loginctl lock-session` sends Lock; a desktop that locks by itself sets LockedHint. Other users' sessions are none of ours.
void SessionLock::listenToLogins() {
  auto bus = sdbus::createSystemBusConnection();
  NameOwners managers;
  const NameOwner& manager = *managers.emplace_back(std::make_unique<NameOwner>(*bus, logins));
  for (const LoginSession& session : loginSessions(*bus)) {
    if (std::get<1>(session) != getuid()) continue;
    const std::string ofSession = "type='signal',sender='" + std::string(logins) + "',path='" + std::get<4>(session) + "',";
    bus->addMatch(ofSession + "member='Lock',interface='" + loginSession + "'",
                  whenLocked(_onLock, manager, [](sdbus::Message&) { return true; }), sdbus::floating_slot);
    bus->addMatch(ofSession + "member='PropertiesChanged',interface='org.freedesktop.DBus.Properties'",
                  whenLocked(_onLock, manager, saysItIsLocked), sdbus::floating_slot);
  }
  _listeners.push_back(std::make_unique<Listener>(std::move(bus), std::move(managers)));
}

}  // namespace palisade
