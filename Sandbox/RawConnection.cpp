#include "Sandbox/RawConnection.h"

#include <poll.h>
#include <sys/socket.h>

#include <algorithm>
#include <limits>

namespace palisade::sandbox {

RawConnection::~RawConnection() { shutdown(SSL_get_fd(&_connection), SHUT_RDWR); }

bool RawConnection::write(std::string_view bytes) {
  constexpr std::size_t most = std::numeric_limits<int>::max();
  while (!bytes.empty()) {
    const int written = SSL_write(&_connection, bytes.data(), static_cast<int>(std::min(bytes.size(), most)));
    if (written > 0) {
      bytes.remove_prefix(static_cast<std::size_t>(written));
      continue;
    }
    if (SSL_get_error(&_connection, written) != SSL_ERROR_WANT_WRITE) return false;
    pollfd writable = {.fd = SSL_get_fd(&_connection), .events = POLLOUT, .revents = 0};
    poll(&writable, 1, -1);
  }
  return true;
}

void RawConnection::waitForClient() {
  pollfd heard = {.fd = SSL_get_fd(&_connection), .events = POLLIN | POLLRDHUP, .revents = 0};
  poll(&heard, 1, -1);
}

void RawConnection::reset() {
  // Connecting a stream socket to nowhere ends its connection with a reset.
  const sockaddr nowhere = {.sa_family = AF_UNSPEC, .sa_data = {}};
  static_cast<void>(connect(SSL_get_fd(&_connection), &nowhere, sizeof nowhere));
}

}  // namespace palisade::sandbox
