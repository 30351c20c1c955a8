#include "Host/Bus/TokenPipe.h"

#include <fcntl.h>
#include <poll.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstddef>
#include <mutex>
#include <optional>
#include <utility>

#include "Host/Bus/AccountsService.h"

// Whoever sends a descriptor may hold another one of the same pipe: take out of it what we have seen in it, change its flags,
// or leave it open. And a file may be served by a program that never answers, to a look at its state neither. So the kernel is
// asked what the descriptor is, without asking the file, and what a pipe brings is moved into a pipe of our own, which does not
// wait.

namespace palisade {
namespace {

constexpr std::size_t longestAccountToken = 64 * 1024;

struct Pipe {
  Pipe() {
    int ends[2];
    if (pipe2(ends, O_CLOEXEC | O_NONBLOCK) != 0) {
      throw BusFailure(BusFailureKind::failed, "No pipe could be made for the token.");
    }
    reader = sdbus::UnixFd(ends[0], sdbus::adopt_fd);
    writer = sdbus::UnixFd(ends[1], sdbus::adopt_fd);
  }

  sdbus::UnixFd reader;
  sdbus::UnixFd writer;
};

// Moves what there is to the end of `content`; none when there is nothing now, false at the end of the pipe. One pipe of ours
// is enough for all: it is empty before and after, and descriptors are what a crowd of senders makes scarce.
std::optional<bool> takeMore(const sdbus::UnixFd& source, std::string& content) {
  constexpr std::size_t portion = 4096;
  static const Pipe ours;
  static std::mutex mutex;
  const std::lock_guard lock(mutex);
  const std::size_t before = content.size();
  // First, for it may fail: what has been moved has to be taken out again.
  content.resize(before + portion);
  const ssize_t moved = splice(source.get(), nullptr, ours.writer.get(), nullptr, portion, SPLICE_F_NONBLOCK);
  const int reason = errno;
  content.resize(before + static_cast<std::size_t>(std::max<ssize_t>(moved, 0)));
  for (std::size_t place = before; place < content.size();) {
    const ssize_t taken = read(ours.reader.get(), content.data() + place, content.size() - place);
    if (taken > 0) place += static_cast<std::size_t>(taken);
  }
  if (moved > 0) return true;
  if (moved == 0) return false;
  if (reason == EAGAIN || reason == EINTR) return std::nullopt;
  throw BusFailure(BusFailureKind::invalidArguments, "The token could not be read from its pipe.");
}

}  // namespace

std::string readToEnd(const sdbus::UnixFd& descriptor, std::chrono::milliseconds limit) {
  if (fcntl(descriptor.get(), F_GETPIPE_SZ) < 0) {
    throw BusFailure(BusFailureKind::invalidArguments, "A token has to come in a pipe.");
  }
  const auto deadline = std::chrono::steady_clock::now() + limit;
  std::string content;
  while (true) {
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(deadline - std::chrono::steady_clock::now());
    pollfd source{.fd = descriptor.get(), .events = POLLIN, .revents = 0};
    const int ready = left.count() > 0 ? poll(&source, 1, static_cast<int>(left.count())) : 0;
    if (ready == 0) {
      throw BusFailure(BusFailureKind::invalidArguments,
                       "The token did not come to its end in time. Write it, and close the pipe.");
    }
    const auto isMore = ready > 0 ? takeMore(descriptor, content) : std::nullopt;
    if (isMore == false) return content;
    if (content.size() > longestAccountToken)
      throw BusFailure(BusFailureKind::invalidArguments, "The token is longer than 64 KiB.");
  }
}

sdbus::UnixFd pipeHolding(const std::string& content) {
  Pipe pipe;
  if (write(pipe.writer.get(), content.data(), content.size()) != static_cast<ssize_t>(content.size())) {
    throw BusFailure(BusFailureKind::failed, "The token does not fit into a pipe.");
  }
  return std::move(pipe.reader);
}

}  // namespace palisade
