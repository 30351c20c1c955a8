#include "Host/Identity/BusSockets.h"

#include <fcntl.h>
#include <linux/netlink.h>
#include <linux/sock_diag.h>
#include <linux/unix_diag.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <charconv>
#include <cstdint>
#include <cstring>
#include <filesystem>
#include <set>
#include <string_view>
#include <system_error>
#include <utility>
#include <vector>

// The kernel is asked about one socket at a time, by its inode. That costs a microsecond or two each; a list of all sockets of
// the machine would cost more, and anybody can make that one long.

namespace palisade {
namespace {

bool isSameFile(const FileDescriptor& folder, const char* name, const char* other) {
  struct stat one {};
  struct stat two {};
  return fstatat(folder.number(), name, &one, 0) == 0 && stat(other, &two) == 0 && one.st_dev == two.st_dev &&
         one.st_ino == two.st_ino;
}

// The inodes of the sockets that the process holds; none when they cannot be listed.
std::optional<std::vector<SocketInode>> socketsOf(const FileDescriptor& processFolder) {
  const FileDescriptor folder(openat(processFolder.number(), "fd", O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (!folder.isOpen()) return std::nullopt;
  std::vector<SocketInode> sockets;
  std::error_code error;
  const std::filesystem::path path = "/proc/self/fd/" + std::to_string(folder.number());
  for (std::filesystem::directory_iterator entry(path, error), end; !error && entry != end; entry.increment(error)) {
    std::array<char, 64> target{};
    const ssize_t length = readlinkat(folder.number(), entry->path().filename().c_str(), target.data(), target.size());
    constexpr std::string_view beginning = "socket:[";
    if (length <= static_cast<ssize_t>(beginning.size())) continue;
    const std::string_view text(target.data(), static_cast<std::size_t>(length));
    SocketInode inode = 0;
    if (!text.starts_with(beginning)) continue;
    if (std::from_chars(text.data() + beginning.size(), text.data() + text.size(), inode).ec == std::errc()) {
      sockets.push_back(inode);
    }
  }
  if (error) return std::nullopt;
  return sockets;
}

struct SocketFacts {
  std::optional<SocketInode> peer;
  std::string address;
};

class SocketDiagnosis {
 public:
  SocketDiagnosis() : _kernel(socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC, NETLINK_SOCK_DIAG)) {}

  // The kernel gives the same answer for a socket that it does not know and for a diagnosis that it lacks. So it is asked about
  // a socket that is certainly there.
  bool works() {
    std::array<int, 2> pair{};
    if (!_kernel.isOpen() || socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, pair.data()) != 0) return false;
    const FileDescriptor one(pair[0]);
    const FileDescriptor other(pair[1]);
    struct stat status {};
    return fstat(one.number(), &status) == 0 && about(static_cast<SocketInode>(status.st_ino)).has_value();
  }

  // None for a socket of another kind or another network.
  std::optional<SocketFacts> about(SocketInode inode) {
    struct {
      nlmsghdr header;
      unix_diag_req body;
    } request{};
    request.header = {.nlmsg_len = sizeof(request),
                      .nlmsg_type = SOCK_DIAG_BY_FAMILY,
                      .nlmsg_flags = NLM_F_REQUEST,
                      .nlmsg_seq = ++_sequence,
                      .nlmsg_pid = 0};
    request.body.sdiag_family = AF_UNIX;
    request.body.udiag_states = ~0U;
    request.body.udiag_ino = inode;
    request.body.udiag_show = UDIAG_SHOW_NAME | UDIAG_SHOW_PEER;
    request.body.udiag_cookie[0] = request.body.udiag_cookie[1] = ~0U;
    if (send(_kernel.number(), &request, sizeof(request), 0) != static_cast<ssize_t>(sizeof(request))) return std::nullopt;
    alignas(nlmsghdr) std::array<char, 4096> answer{};
    const ssize_t length = recv(_kernel.number(), answer.data(), answer.size(), 0);
    nlmsghdr header{};
    if (length < static_cast<ssize_t>(sizeof(header))) return std::nullopt;
    std::memcpy(&header, answer.data(), sizeof(header));
    if (header.nlmsg_type != SOCK_DIAG_BY_FAMILY || header.nlmsg_seq != _sequence ||
        header.nlmsg_len > static_cast<std::size_t>(length)) {
      return std::nullopt;
    }
    return factsIn(std::string_view(answer.data(), header.nlmsg_len));
  }

 private:
  static std::optional<SocketFacts> factsIn(std::string_view message) {
    std::size_t place = NLMSG_HDRLEN + NLMSG_ALIGN(sizeof(unix_diag_msg));
    SocketFacts facts;
    while (place + sizeof(nlattr) <= message.size()) {
      nlattr attribute{};
      std::memcpy(&attribute, message.data() + place, sizeof(attribute));
      if (attribute.nla_len < sizeof(attribute) || place + attribute.nla_len > message.size()) return std::nullopt;
      const std::string_view content = message.substr(place + NLA_HDRLEN, attribute.nla_len - NLA_HDRLEN);
      if (attribute.nla_type == UNIX_DIAG_NAME) facts.address = content;
      if (attribute.nla_type == UNIX_DIAG_PEER && content.size() == sizeof(SocketInode)) {
        SocketInode peer = 0;
        std::memcpy(&peer, content.data(), sizeof(peer));
        facts.peer = peer;
      }
      place += NLA_ALIGN(attribute.nla_len);
    }
    // A path is followed by a NUL here; a name in the abstract space begins with one.
    if (!facts.address.empty() && facts.address.front() != '\0') facts.address.resize(std::strlen(facts.address.c_str()));
    return facts;
  }

  FileDescriptor _kernel;
  std::uint32_t _sequence = 0;
};

std::set<SocketInode> socketsOfBus(pid_t busProcess) {
  const FileDescriptor folder(open(("/proc/" + std::to_string(busProcess)).c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
  if (!folder.isOpen()) return {};
  const auto sockets = socketsOf(folder);
  return sockets ? std::set<SocketInode>(sockets->begin(), sockets->end()) : std::set<SocketInode>();
}

}  // namespace

std::optional<std::set<SocketInode>> socketsToBus(const FileDescriptor& processFolder, const std::string& busAddress,
                                                  pid_t busProcess, std::size_t enough) {
  if (!isSameFile(processFolder, "ns/net", "/proc/self/ns/net")) return std::nullopt;
  const auto sockets = socketsOf(processFolder);
  SocketDiagnosis diagnosis;
  if (!sockets || !diagnosis.works()) return std::nullopt;

  std::set<SocketInode> toBus;
  std::vector<std::pair<SocketInode, SocketInode>> others;  // with the other end of each
  for (const SocketInode socket : *sockets) {
    if (toBus.size() >= enough) return toBus;
    const auto facts = diagnosis.about(socket);
    if (!facts || !facts->peer) continue;
    const auto peer = diagnosis.about(*facts->peer);
    if (peer && !busAddress.empty() && peer->address == busAddress) {
      toBus.insert(socket);
    } else {
      others.emplace_back(socket, *facts->peer);
    }
  }
  if (toBus.size() >= enough || others.empty()) return toBus;
  const std::set<SocketInode> heldByBus = socketsOfBus(busProcess);
  for (const auto& [socket, peer] : others) {
    if (heldByBus.contains(peer)) toBus.insert(socket);
  }
  return toBus;
}

}  // namespace palisade
