#include "Host/Bus/BusQuestions.h"

#include <fcntl.h>
#include <sdbus-c++/sdbus-c++.h>
#include <sys/socket.h>
#include <sys/un.h>

#include <cstddef>
#include <cstdint>
#include <cstring>

#include "DBus/BusValue.h"
#include "Host/Bus/AccountsService.h"

namespace palisade {
namespace {

constexpr const char* bus = "org.freedesktop.DBus";
constexpr const char* busPath = "/org/freedesktop/DBus";
constexpr const char* noSuchConnection = "org.freedesktop.DBus.Error.NameHasNoOwner";

// The library's own descriptor is lost to every program that is started meanwhile.
std::shared_ptr<const FileDescriptor> ownDescriptor(const sdbus::UnixFd& descriptor) {
  auto own = std::make_shared<const FileDescriptor>(fcntl(descriptor.get(), F_DUPFD_CLOEXEC, 0));
  if (!own->isOpen()) throw BusFailure(BusFailureKind::unknownCaller, "There is no descriptor left to pin the caller with.");
  return own;
}

}  // namespace

BusQuestions::BusQuestions() = default;
BusQuestions::~BusQuestions() = default;

template <typename Answer, typename... Arguments>
Answer BusQuestions::ask(const char* question, const Arguments&... arguments) {
  const std::lock_guard lock(_mutex);
  if (_connection == nullptr) _connection = sdbus::createSessionBusConnection();
  const auto proxy = sdbus::createProxy(*_connection, bus, busPath);
  Answer answer{};
  proxy->callMethod(question).onInterface(bus).withArguments(arguments...).storeResultsTo(answer);
  return answer;
}

BusCredentials BusQuestions::credentialsOf(const std::string& name) {
  const auto answer = ask<BusDictionary>("GetConnectionCredentials", name);
  const auto process = answer.find("ProcessID");
  const auto user = answer.find("UnixUserID");
  if (process == answer.end() || user == answer.end()) {
    throw BusFailure(BusFailureKind::unknownCaller, "The bus does not say who is calling.");
  }
  BusCredentials credentials{.process = static_cast<pid_t>(process->second.get<std::uint32_t>()),
                             .user = user->second.get<std::uint32_t>(),
                             .pin = nullptr,
                             .securityLabel = std::nullopt};
  if (const auto pin = answer.find("ProcessFD"); pin != answer.end()) {
    credentials.pin = ownDescriptor(pin->second.get<sdbus::UnixFd>());
  }
  if (const auto label = answer.find("LinuxSecurityLabel"); label != answer.end()) {
    const auto bytes = label->second.get<std::vector<std::uint8_t>>();
    credentials.securityLabel.emplace(bytes.begin(), bytes.end());
  }
  return credentials;
}

std::optional<pid_t> BusQuestions::processOf(const std::string& uniqueName) {
  try {
    return static_cast<pid_t>(ask<std::uint32_t>("GetConnectionUnixProcessID", uniqueName));
  } catch (const sdbus::Error& error) {
    if (error.getName() == noSuchConnection) return std::nullopt;
    throw;
  }
}

std::vector<std::string> BusQuestions::names() { return ask<std::vector<std::string>>("ListNames"); }

std::string addressOfBus(const sdbus::IConnection& connection) {
  sockaddr_un address{};
  socklen_t length = sizeof(address);
  if (getpeername(connection.getEventLoopPollData().fd, reinterpret_cast<sockaddr*>(&address), &length) != 0) return {};
  if (address.sun_family != AF_UNIX || length <= offsetof(sockaddr_un, sun_path)) return {};
  const std::string name(address.sun_path, length - offsetof(sockaddr_un, sun_path));
  return name.front() == '\0' ? name : std::string(name.c_str());
}

}  // namespace palisade
