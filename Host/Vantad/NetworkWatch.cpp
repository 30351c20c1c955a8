#include "Host/Vantad/NetworkWatch.h"

#include <linux/netlink.h>
#include <linux/rtnetlink.h>
#include <sys/socket.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstring>
#include <system_error>

namespace palisade {

NetworkWatch::NetworkWatch() : _socket(socket(AF_NETLINK, SOCK_RAW | SOCK_CLOEXEC | SOCK_NONBLOCK, NETLINK_ROUTE)) {
  sockaddr_nl address = {};
  address.nl_family = AF_NETLINK;
  address.nl_groups = RTMGRP_IPV4_IFADDR | RTMGRP_IPV6_IFADDR | RTMGRP_IPV4_ROUTE | RTMGRP_IPV6_ROUTE;
  if (_socket < 0 || bind(_socket, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) {
    const int reason = errno;
    close(_socket);
    throw std::system_error(reason, std::generic_category(), "cannot hear of network changes");
  }
}

NetworkWatch::~NetworkWatch() { close(_socket); }

bool NetworkWatch::hasImproved() {
  bool improved = false;
  std::array<char, 16'384> buffer;
  while (true) {
    const ssize_t size = recv(_socket, buffer.data(), buffer.size(), 0);
    // News were lost; they may have been good.
    if (size < 0 && errno == ENOBUFS) improved = true;
    if (size < 0 && errno != ENOBUFS && errno != EINTR) return improved;
    for (ssize_t position = 0; position + static_cast<ssize_t>(sizeof(nlmsghdr)) <= size;) {
      nlmsghdr message;
      std::memcpy(&message, buffer.data() + position, sizeof message);
      if (message.nlmsg_type == RTM_NEWADDR || message.nlmsg_type == RTM_NEWROUTE) improved = true;
      if (message.nlmsg_len < sizeof message) break;
      position += static_cast<ssize_t>(NLMSG_ALIGN(message.nlmsg_len));
    }
  }
}

}  // namespace palisade
