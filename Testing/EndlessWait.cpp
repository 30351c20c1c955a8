#include "Testing/EndlessWait.h"

#include <array>
#include <cerrno>
#include <cstring>
#include <sstream>
#include <stdexcept>

#include <fcntl.h>
#include <linux/futex.h>
#include <sys/syscall.h>
#include <unistd.h>

namespace palisade {
namespace {

[[noreturn]] void fail(const std::string& path, int reason) {
  throw std::runtime_error("Cannot tell whether a thread waits: " + path + " cannot be opened: " + std::strerror(reason) + ".");
}

// A thread that ends gives its memory back first. From then on until it is gone, its private files belong to root, so that
// nobody else may open them. They belong to root all the time in a process that is closed to its own user; the asking thread,
// which does not end, tells the one from the other.
void requireThatTheProcessIsOpen() {
  const char* const path = "/proc/thread-self/syscall";
  const int descriptor = open(path, O_RDONLY | O_CLOEXEC);
  if (descriptor < 0) fail(path, errno);
  close(descriptor);
}

// The whole of a small file of proc(5); none when the thread ends or is gone.
std::optional<std::string> contentOf(pid_t thread, const char* file) {
  const std::string path = "/proc/self/task/" + std::to_string(thread) + '/' + file;
  const int descriptor = open(path.c_str(), O_RDONLY | O_CLOEXEC);
  if (descriptor < 0) {
    const int reason = errno;
    if (reason != ENOENT && reason != ESRCH && reason != EACCES) fail(path, reason);
    if (reason == EACCES) requireThatTheProcessIsOpen();
    return std::nullopt;
  }
  std::array<char, 4096> buffer;
  const ssize_t length = read(descriptor, buffer.data(), buffer.size());
  close(descriptor);
  if (length < 0) return std::nullopt;
  return std::string(buffer.data(), static_cast<std::size_t>(length));
}

bool isWaitingOperation(unsigned long operation) {
  switch (operation & static_cast<unsigned long>(FUTEX_CMD_MASK)) {
    case FUTEX_WAIT:
    case FUTEX_WAIT_BITSET:
    case FUTEX_LOCK_PI:
    case FUTEX_WAIT_REQUEUE_PI: return true;
    default: return false;
  }
}

// `line` is a thread's system call as in proc_pid_syscall(5): its number, then its arguments in hexadecimal. In all calls of
// the futex family the time-out is the fourth argument.
bool isEndlessFutexWait(const std::string& line) {
  std::istringstream words(line);
  long number = 0;
  if (!(words >> number)) return false;
  std::array<unsigned long, 4> arguments{};
  for (unsigned long& argument : arguments) words >> std::hex >> argument;
  if (!words || arguments[3] != 0) return false;
#ifdef SYS_futex_waitv
  if (number == SYS_futex_waitv) return true;
#endif
#ifdef SYS_futex_time64
  if (number == SYS_futex_time64) return isWaitingOperation(arguments[1]);
#endif
#ifdef SYS_futex
  if (number == SYS_futex) return isWaitingOperation(arguments[1]);
#endif
  return false;
}

}  // namespace

std::optional<std::string> endlessWaitOf(pid_t thread) {
  const auto call = contentOf(thread, "syscall");
  if (!call || !isEndlessFutexWait(*call)) return std::nullopt;
  const auto status = contentOf(thread, "status");
  if (!status || status->find("\nState:\tS") == std::string::npos) return std::nullopt;
  // How often the thread was switched, the last lines of the file.
  const std::size_t switches = status->find("\nvoluntary_ctxt_switches:");
  if (switches == std::string::npos)
    throw std::runtime_error("Cannot tell whether a thread waits: no context switches counted.");
  return *call + status->substr(switches);
}

}  // namespace palisade
