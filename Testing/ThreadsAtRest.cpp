#include "Testing/ThreadsAtRest.h"

#include <array>
#include <cctype>
#include <charconv>
#include <filesystem>
#include <map>
#include <optional>
#include <sstream>
#include <stdexcept>
#include <string>
#include <string_view>
#include <thread>

#include <fcntl.h>
#include <linux/futex.h>
#include <sys/syscall.h>
#include <unistd.h>

namespace palisade {
namespace {

const std::filesystem::path tasks = "/proc/self/task";

std::set<pid_t> runningThreads() {
  std::set<pid_t> threads;
  for (const auto& entry : std::filesystem::directory_iterator(tasks)) threads.insert(std::stoi(entry.path().filename()));
  return threads;
}

// The whole of a small file of proc(5); none when the thread has ended meanwhile.
std::optional<std::string> contentOf(pid_t thread, const char* file) {
  const std::filesystem::path path = tasks / std::to_string(thread) / file;
  const int descriptor = open(path.c_str(), O_RDONLY | O_CLOEXEC);
  if (descriptor < 0) {
    if (errno == ENOENT || errno == ESRCH) return std::nullopt;
    throw std::runtime_error("Cannot tell whether a thread waits: " + path.string() + " cannot be opened.");
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

// `line` is a thread's system call as in proc_pid_syscall(5): its number, then six arguments in hexadecimal.
bool isEndlessWait(const std::string& line) {
  std::istringstream words(line);
  long number = 0;
  if (!(words >> number)) return false;
  std::array<unsigned long, 4> arguments{};
  for (unsigned long& argument : arguments) words >> std::hex >> argument;
  if (!words) return false;
  const bool hasTimeout = arguments[3] != 0;
#ifdef SYS_futex_waitv
  if (number == SYS_futex_waitv) return !hasTimeout;
#endif
#ifdef SYS_futex_time64
  if (number == SYS_futex_time64) return !hasTimeout && isWaitingOperation(arguments[1]);
#endif
#ifdef SYS_futex
  return number == SYS_futex && !hasTimeout && isWaitingOperation(arguments[1]);
#else
  return false;
#endif
}

// What changes whenever a thread runs: its system call and how often it was switched. None when it is not at rest.
std::optional<std::string> restingStateOf(pid_t thread) {
  const auto call = contentOf(thread, "syscall");
  if (!call || !isEndlessWait(*call)) return std::nullopt;
  const auto status = contentOf(thread, "status");
  if (!status || status->find("\nState:\tS") == std::string::npos) return std::nullopt;
  const std::size_t switches = status->find("\nvoluntary_ctxt_switches:");
  return *call + (switches == std::string::npos ? "" : status->substr(switches));
}

using RestingStates = std::map<pid_t, std::string>;

std::optional<RestingStates> restingStates(const std::set<pid_t>& unwatched) {
  RestingStates states;
  const pid_t caller = gettid();
  for (const pid_t thread : runningThreads()) {
    if (thread == caller || unwatched.contains(thread)) continue;
    const auto state = restingStateOf(thread);
    if (!state) return std::nullopt;
    states.emplace(thread, *state);
  }
  return states;
}

}  // namespace

ThreadsAtRest::ThreadsAtRest() {
  // A sanitizer's runtime starts a thread of its own, which never rests, together with the first thread of the program.
  std::thread([] {}).join();
  _unwatched = runningThreads();
}

bool ThreadsAtRest::now() const {
  // Two looks alike: between the end of the first and the start of the second, all threads slept at once.
  const auto first = restingStates(_unwatched);
  if (!first) return false;
  return first->empty() || first == restingStates(_unwatched);
}

}  // namespace palisade
