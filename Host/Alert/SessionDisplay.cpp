#include "Host/Alert/SessionDisplay.h"

#include <netdb.h>
#include <poll.h>
#include <sys/socket.h>
#include <sys/un.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <string>
#include <string_view>
#include <utility>

#include "Host/Alert/Deadline.h"
#include "Host/Alert/OwnServer.h"
#include "Host/Alert/WaylandCompositor.h"
#include "Host/Files/FileDescriptor.h"

namespace palisade {
namespace {

std::string variable(const char* name) {
  const char* value = std::getenv(name);
  return value == nullptr ? "" : value;
}

// `path` begins with a zero byte for a socket in Linux's abstract namespace (unix(7)). What it returns is not open when nobody
// takes connections there.
FileDescriptor connectedTo(const std::string& path) {
  sockaddr_un address{};
  address.sun_family = AF_UNIX;
  if (path.empty() || path.size() >= sizeof address.sun_path) return FileDescriptor(-1);
  std::memcpy(address.sun_path, path.data(), path.size());
  const bool isAbstract = path.front() == '\0';
  const auto size = static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + path.size() + (isAbstract ? 0 : 1));
  FileDescriptor connection(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
  const bool isConnected =
      connection.isOpen() && connect(connection.number(), reinterpret_cast<const sockaddr*>(&address), size) == 0;
  return isConnected ? std::move(connection) : FileDescriptor(-1);
}

FileDescriptor waylandDisplay() {
  const std::string name = variable("WAYLAND_DISPLAY");
  if (name.empty()) return FileDescriptor(-1);
  return connectedTo(name.front() == '/' ? name : variable("XDG_RUNTIME_DIR") + "/" + name);
}

// The number in ":0" or ":0.1"; none for another text. With a host before the colon, the display is reached over the network.
std::optional<std::string> displayNumber(std::string_view name) {
  if (!name.starts_with(':')) return std::nullopt;
  const std::string_view number = name.substr(1, name.find('.') - 1);
  const bool isNumber = !number.empty() && number.size() < 6 &&
                        std::ranges::all_of(number, [](char digit) { return digit >= '0' && digit <= '9'; });
  return isNumber ? std::optional<std::string>(number) : std::nullopt;
}

// In the order in which the X library tries the two: the first that takes connections is the one that a window would be shown
// by.
FileDescriptor x11Display() {
  const auto number = displayNumber(variable("DISPLAY"));
  if (!number) return FileDescriptor(-1);
  const std::string path = "/tmp/.X11-unix/X" + *number;
  FileDescriptor abstract = connectedTo(std::string(1, '\0') + path);
  return abstract.isOpen() ? std::move(abstract) : connectedTo(path);
}

bool takesConnections(const addrinfo& address, Deadline deadline) {
  const FileDescriptor connection(socket(address.ai_family, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
  if (!connection.isOpen()) return false;
  if (connect(connection.number(), address.ai_addr, address.ai_addrlen) == 0) return true;
  pollfd connected{.fd = connection.number(), .events = POLLOUT, .revents = 0};
  if (errno != EINPROGRESS || poll(&connected, 1, millisecondsLeft(deadline)) != 1) return false;
  int failure = 0;
  socklen_t size = sizeof failure;
  return getsockopt(connection.number(), SOL_SOCKET, SO_ERROR, &failure, &size) == 0 && failure == 0;
}

// "HOST:NUMBER" or "HOST:NUMBER.SCREEN".
bool isNetworkDisplayReachable(const std::string& name) {
  constexpr int firstPort = 6000;
  constexpr int mostDisplays = 65536 - firstPort;
  const std::size_t colon = name.rfind(':');
  const auto number = colon == std::string::npos ? std::nullopt : displayNumber(name.substr(colon));
  if (!number || colon == 0 || std::stoi(*number) >= mostDisplays) return false;
  addrinfo wanted{};
  wanted.ai_socktype = SOCK_STREAM;
  addrinfo* found = nullptr;
  const std::string port = std::to_string(firstPort + std::stoi(*number));
  if (getaddrinfo(name.substr(0, colon).c_str(), port.c_str(), &wanted, &found) != 0) return false;
  const Deadline deadline = std::chrono::steady_clock::now() + std::chrono::milliseconds(500);
  bool isReachable = false;
  for (const addrinfo* address = found; address != nullptr && !isReachable; address = address->ai_next) {
    isReachable = takesConnections(*address, deadline);
  }
  freeaddrinfo(found);
  return isReachable;
}

}  // namespace

bool hasUsableDisplay(const std::optional<std::string>& networkDisplay) {
  const FileDescriptor wayland = waylandDisplay();
  const FileDescriptor x11 = x11Display();
  if (wayland.isOpen() || x11.isOpen()) {
    return (!wayland.isOpen() || isOwnServer(wayland.number())) && (!x11.isOpen() || isOwnServer(x11.number()));
  }
  return networkDisplay && variable("DISPLAY") == *networkDisplay && isNetworkDisplayReachable(*networkDisplay);
}

// Where there are both, windows are Wayland's.
bool keepsWindowsOnTop() {
  const FileDescriptor compositor = waylandDisplay();
  return compositor.isOpen() ? offersGlobal(compositor, "zwlr_layer_shell_v1") : !variable("DISPLAY").empty();
}

}  // namespace palisade
