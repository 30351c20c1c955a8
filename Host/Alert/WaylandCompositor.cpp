// The few messages of Wayland's protocol that are needed to hear what there is: get_registry, which has the compositor announce
// each of its globals, and sync, which it answers when it has. A message is the number of an object, one word with its size in
// the upper half and its operation in the lower, and the arguments, in the machine's byte order. A text is its length with the
// zero byte behind it, and its bytes up to a whole word.

#include "Host/Alert/WaylandCompositor.h"

#include <poll.h>
#include <sys/socket.h>

#include <array>
#include <chrono>
#include <cstdint>
#include <cstring>
#include <string>

#include "Host/Alert/Deadline.h"
#include "Host/Files/FileDescriptor.h"

namespace palisade {
namespace {

constexpr std::chrono::milliseconds longestAnnouncement(500);
/// A compositor has some dozens of globals.
constexpr std::size_t largestAnnouncement = 256 * 1024;

constexpr std::uint32_t display = 1;
constexpr std::uint32_t registry = 2;
constexpr std::uint32_t callback = 3;
constexpr std::uint32_t header = 8;
constexpr std::uint32_t firstEvent = 0;

constexpr std::uint32_t operation(std::uint32_t size, std::uint32_t number) { return size << 16 | number; }

constexpr std::array<std::uint32_t, 6> getRegistryAndSync = {display, operation(header + 4, 1), registry,
                                                             display, operation(header + 4, 0), callback};

std::uint32_t wordAt(std::string_view bytes, std::size_t position) {
  std::uint32_t word = 0;
  std::memcpy(&word, bytes.data() + position, sizeof word);
  return word;
}

// The interface in the arguments of an announcement: the global's number, the text, its version.
std::string_view announcedInterface(std::string_view arguments) {
  if (arguments.size() < 8) return {};
  const std::uint32_t size = wordAt(arguments, 4);
  return size == 0 || size > arguments.size() - 8 ? std::string_view() : arguments.substr(8, size - 1);
}

enum class Announcement { found, going, over };

// Takes whole messages off `received`.
Announcement readAnnouncements(std::string& received, std::string_view interface) {
  while (received.size() >= header) {
    const std::uint32_t object = wordAt(received, 0);
    const std::uint32_t size = wordAt(received, 4) >> 16;
    const std::uint32_t event = wordAt(received, 4) & 0xFFFF;
    if (size < header || object == callback || object == display) return Announcement::over;
    if (size > received.size()) return Announcement::going;
    const std::string message = received.substr(header, size - header);
    if (object == registry && event == firstEvent && announcedInterface(message) == interface) return Announcement::found;
    received.erase(0, size);
  }
  return Announcement::going;
}

}  // namespace

bool offersGlobal(const FileDescriptor& connection, std::string_view interface) {
  const int socket = connection.number();
  if (send(socket, getRegistryAndSync.data(), sizeof getRegistryAndSync, MSG_NOSIGNAL) != sizeof getRegistryAndSync)
    return false;
  const Deadline deadline = std::chrono::steady_clock::now() + longestAnnouncement;
  std::string received;
  std::size_t total = 0;
  auto announcement = Announcement::going;
  while (announcement == Announcement::going && total < largestAnnouncement) {
    std::array<char, 4096> buffer;
    pollfd source{.fd = socket, .events = POLLIN, .revents = 0};
    if (poll(&source, 1, millisecondsLeft(deadline)) <= 0) return false;
    const ssize_t length = recv(socket, buffer.data(), buffer.size(), MSG_DONTWAIT);
    if (length <= 0) return false;
    received.append(buffer.data(), static_cast<std::size_t>(length));
    total += static_cast<std::size_t>(length);
    announcement = readAnnouncements(received, interface);
  }
  return announcement == Announcement::found;
}

}  // namespace palisade
