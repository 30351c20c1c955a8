// Who is asked has to be known for certain, because only its word counts: an owner that is there is asked by its unique name. A
// backend that the bus has to start is asked by its own name, and the owner is whoever takes that name first. The bus announces
// it before the owner can reply.

#include "Host/Bus/BusAccessDialog.h"

#include <poll.h>
#include <sdbus-c++/sdbus-c++.h>
#include <sys/eventfd.h>

#include <algorithm>
#include <map>
#include <optional>
#include <utility>
#include <vector>

#include "Host/Alert/PortalBackend.h"
#include "Host/Bus/SignalSender.h"
#include "Host/Files/FileDescriptor.h"
#include "Host/Text/ValidText.h"

namespace palisade {
namespace {

constexpr const char* busDriver = "org.freedesktop.DBus";
constexpr const char* busDriverPath = "/org/freedesktop/DBus";
constexpr const char* portalPath = "/org/freedesktop/portal/desktop";

/// The user may be at lunch.
constexpr std::uint64_t withoutTimeout = UINT64_MAX;

/// How long a backend may take to close a dialog before it is left to itself.
constexpr std::chrono::milliseconds longestFarewell(500);
constexpr std::chrono::milliseconds pauseBeforeClosingAgain(20);

// On GNOME an application that is named is asked for only while it has the focus, and the user is asked for accounts whichever
// has it. The dialog says who asks in its text.
constexpr const char* unnamedApplication = "";
constexpr const char* noParentWindow = "";

using Options = std::map<std::string, sdbus::Variant>;

// The type of what is read next; a zero byte at the end.
std::string nextType(const sdbus::Message& message) {
  std::string type;
  std::string contents;
  message.peekType(type, contents);
  return type + contents;
}

// Of a reply of the form "ua{sv}", and nothing behind it.
std::optional<std::uint32_t> responseIn(sdbus::MethodReply& reply) {
  const std::string end(1, '\0');
  std::uint32_t response = 0;
  Options results;
  if (nextType(reply) != "u") return std::nullopt;
  reply >> response;
  if (nextType(reply) != "a{sv}") return std::nullopt;
  reply >> results;
  return nextType(reply) == end ? std::optional(response) : std::nullopt;
}

class BusAccessDialog final : public AccessDialog {
 public:
  BusAccessDialog(const std::string& backend, const AccessQuestion& question, FileDescriptor takenDown)
      : _backend(backend),
        _takenDown(std::move(takenDown)),
        _connection(sdbus::createSessionBusConnection()) {
    std::string sender = _connection->getUniqueName().substr(1);
    std::ranges::replace(sender, '.', '_');
    _handle = std::string(portalPath) + "/request/" + sender + "/palisade";
    _ownerWatch = _connection->addMatch(
        "type='signal',sender='" + std::string(busDriver) + "',member='NameOwnerChanged',arg0='" + backend + "'",
        [this](sdbus::Message& signal) { ownerChanged(signal); });
    _owner = ownerOnBus(*_connection, backend);
    ask(question);
  }

  BusAccessDialog(const BusAccessDialog&) = delete;
  BusAccessDialog& operator=(const BusAccessDialog&) = delete;
  ~BusAccessDialog() override {
    try {
      seeItClosed();
    } catch (const sdbus::Error&) {
      // Without a bus there is nobody to tell.
      return;
    }
  }

  std::optional<AccessReply> waitForReply(Deadline deadline) override {
    // What has come before cannot be told from what comes at once.
    _askedAt = std::chrono::steady_clock::now();
    try {
      while (!_isOver && !isTakenDown() && std::chrono::steady_clock::now() < deadline) {
        if (!_connection->processPendingRequest()) waitForBus(deadline, _takenDown.number());
      }
      _isOver = true;
      if (_isShown) askToClose();
    } catch (const sdbus::Error&) {
      // The bus is gone, and the session with it.
      _isShown = false;
      return std::nullopt;
    }
    return _reply;
  }

  void takeDown() override { eventfd_write(_takenDown.number(), 1); }

 private:
  void ask(const AccessQuestion& question) {
    const Options options = {{"modal", true},
                             {"deny_label", validText(question.denyLabel)},
                             {"grant_label", validText(question.grantLabel)},
                             {"icon", std::string("dialog-password-symbolic")}};
    _portal = sdbus::createProxy(*_connection, _owner.value_or(_backend), portalPath);
    auto call = _portal->createMethodCall(std::string(accessInterface), "AccessDialog");
    call << sdbus::ObjectPath(_handle) << unnamedApplication << noParentWindow << validText(question.title)
         << validText(question.subtitle) << validText(question.body) << options;
    _portal->callMethod(
        call, [this](sdbus::MethodReply& reply, const sdbus::Error* error) { replied(reply, error); }, withoutTimeout);
  }

  bool isTakenDown() const {
    pollfd source{.fd = _takenDown.number(), .events = POLLIN, .revents = 0};
    return poll(&source, 1, 0) != 0;
  }

  // Passes over a descriptor that is negative.
  void waitForBus(Deadline deadline, int orElse = -1) const {
    const auto bus = _connection->getEventLoopPollData();
    pollfd sources[] = {{.fd = orElse, .events = POLLIN, .revents = 0}, {.fd = bus.fd, .events = bus.events, .revents = 0}};
    const int left = millisecondsLeft(deadline);
    const int ofBus = bus.getPollTimeout();
    poll(sources, std::size(sources), left < 0 || (ofBus >= 0 && ofBus < left) ? ofBus : left);
  }

  void ownerChanged(sdbus::Message& signal) {
    if (!isFromBus(signal)) return;
    std::string name;
    std::string before;
    std::string after;
    signal >> name >> before >> after;
    if (!_owner && !after.empty()) {
      // The bus has started it and hands it the question now.
      _owner = after;
      _askedAt = std::chrono::steady_clock::now();
    } else if (_owner == before) {
      _isOver = true;
    }
  }

  void replied(sdbus::MethodReply& reply, const sdbus::Error* error) {
    const auto after = std::chrono::steady_clock::now() - _askedAt;
    _isShown = false;
    if (_isOver) return;
    _isOver = true;
    if (error != nullptr || reply.getSender() != _owner) return;
    try {
      if (const auto response = responseIn(reply)) _reply = AccessReply{.response = *response, .after = after};
    } catch (const sdbus::Error&) {
      _reply.reset();
    }
  }

  void askToClose() {
    _request = sdbus::createProxy(*_connection, _owner.value_or(_backend), _handle);
    _closeAgainAt = Deadline::max();
    const auto call = _request->createMethodCall("org.freedesktop.impl.portal.Request", "Close");
    _request->callMethod(
        call,
        [this](sdbus::MethodReply&, const sdbus::Error* error) {
          if (error == nullptr) _isShown = false;
          _closeAgainAt = std::chrono::steady_clock::now() + pauseBeforeClosingAgain;
        },
        withoutTimeout);
  }

  // A dialog outlives whoever asked, unless it is told. One that is still being made does not hear it the first time.
  void seeItClosed() {
    const Deadline deadline = std::chrono::steady_clock::now() + longestFarewell;
    while (_isShown && std::chrono::steady_clock::now() < deadline) {
      if (_request == nullptr || std::chrono::steady_clock::now() >= _closeAgainAt) askToClose();
      if (!_connection->processPendingRequest()) waitForBus(std::min(deadline, _closeAgainAt));
    }
  }

  std::string _backend;
  FileDescriptor _takenDown;
  std::unique_ptr<sdbus::IConnection> _connection;
  sdbus::Slot _ownerWatch;
  /// The unique name of whom was asked; none while the bus starts it.
  std::optional<std::string> _owner;
  std::string _handle;
  std::unique_ptr<sdbus::IProxy> _portal;
  std::unique_ptr<sdbus::IProxy> _request;
  Deadline _closeAgainAt = Deadline::max();
  std::chrono::steady_clock::time_point _askedAt;
  bool _isShown = true;
  bool _isOver = false;
  std::optional<AccessReply> _reply;
};

}  // namespace

bool isOnSessionBus(const std::string& name) {
  try {
    const auto bus = sdbus::createSessionBusConnection();
    if (ownerOnBus(*bus, name)) return true;
    std::vector<std::string> names;
    sdbus::createProxy(*bus, busDriver, busDriverPath)
        ->callMethod("ListActivatableNames")
        .onInterface(busDriver)
        .storeResultsTo(names);
    return std::ranges::count(names, name) > 0;
  } catch (const sdbus::Error&) {
    return false;
  }
}

std::unique_ptr<AccessDialog> openAccessDialog(const std::string& backend, const AccessQuestion& question) {
  FileDescriptor takenDown(eventfd(0, EFD_CLOEXEC));
  if (!takenDown.isOpen()) return nullptr;
  try {
    return std::make_unique<BusAccessDialog>(backend, question, std::move(takenDown));
  } catch (const sdbus::Error&) {
    return nullptr;
  }
}

}  // namespace palisade
