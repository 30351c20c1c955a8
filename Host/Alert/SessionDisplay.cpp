#include "Host/Alert/SessionDisplay.h"

#include <sys/socket.h>
#include <sys/un.h>

#include <algorithm>
#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <string>
#include <utility>

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

// ":0" or ":0.1". With a host before the colon, the display is reached over the network.
bool hasX11Display() {
  const std::string name = variable("DISPLAY");
  if (!name.starts_with(':')) return false;
  const std::string number = name.substr(1, name.find('.') - 1);
  if (number.empty() || !std::ranges::all_of(number, [](char digit) { return digit >= '0' && digit <= '9'; })) return false;
  const std::string path = "/tmp/.X11-unix/X" + number;
  return connectedTo(path).isOpen() || connectedTo(std::string(1, '\0') + path).isOpen();
}

}  // namespace

bool hasUsableDisplay() { return waylandDisplay().isOpen() || hasX11Display(); }

// Where there are both, windows are Wayland's.
bool keepsWindowsOnTop() {
  const FileDescriptor compositor = waylandDisplay();
  return compositor.isOpen() ? offersGlobal(compositor, "zwlr_layer_shell_v1") : hasX11Display();
}

}  // namespace palisade
