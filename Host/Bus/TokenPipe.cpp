#include "Host/Bus/TokenPipe.h"

#include <fcntl.h>
#include <poll.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstddef>

#include "Host/Bus/AccountsService.h"

namespace palisade {
namespace {

constexpr std::size_t longestAccountToken = 64 * 1024;
constexpr std::chrono::seconds longestTokenTransfer(10);

}  // namespace

std::string readToEnd(const sdbus::UnixFd& descriptor) {
  const auto deadline = std::chrono::steady_clock::now() + longestTokenTransfer;
  std::string content;
  char buffer[4096];
  while (true) {
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(deadline - std::chrono::steady_clock::now());
    pollfd source{.fd = descriptor.get(), .events = POLLIN, .revents = 0};
    const int ready = left.count() > 0 ? poll(&source, 1, static_cast<int>(left.count())) : 0;
    if (ready < 0 && errno == EINTR) continue;
    if (ready == 0) {
      throw BusFailure(BusFailureKind::invalidArguments,
                       "The token did not come to its end within 10 seconds. Write it, and close the descriptor.");
    }
    const ssize_t length = read(descriptor.get(), buffer, sizeof buffer);
    if (length < 0 && errno == EINTR) continue;
    if (length < 0) throw BusFailure(BusFailureKind::invalidArguments, "The token could not be read from its descriptor.");
    if (length == 0) return content;
    content.append(buffer, static_cast<std::size_t>(length));
    if (content.size() > longestAccountToken)
      throw BusFailure(BusFailureKind::invalidArguments, "The token is longer than 64 KiB.");
  }
}

sdbus::UnixFd pipeHolding(const std::string& content) {
  int ends[2];
  if (pipe2(ends, O_CLOEXEC | O_NONBLOCK) != 0)
    throw BusFailure(BusFailureKind::failed, "No pipe could be made for the token.");
  sdbus::UnixFd reader(ends[0], sdbus::adopt_fd);
  const sdbus::UnixFd writer(ends[1], sdbus::adopt_fd);
  if (write(writer.get(), content.data(), content.size()) != static_cast<ssize_t>(content.size())) {
    throw BusFailure(BusFailureKind::failed, "The token does not fit into a pipe.");
  }
  return reader;
}

}  // namespace palisade
