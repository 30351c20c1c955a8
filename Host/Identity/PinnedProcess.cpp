#include "Host/Identity/PinnedProcess.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <systemd/sd-login.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <climits>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <string_view>
#include <utility>

#include "Host/Identity/IdentityError.h"

// Between pidfd_open and the opening of /proc/PID the process may end and its number be given to another one. Then the pinned
// process is dead at the end, and everything that was read about the other one is thrown away.

namespace palisade {
namespace {

constexpr std::size_t largestInfo = 64 * 1024;
constexpr std::size_t largestLabel = 4 * 1024;
constexpr std::size_t largestCgroups = 256 * 1024;
constexpr std::size_t largestStatus = 64 * 1024;

// The C library's own declaration cannot be used from C++.
std::shared_ptr<const FileDescriptor> openPin(pid_t process) {
  return std::make_shared<const FileDescriptor>(static_cast<int>(syscall(SYS_pidfd_open, process, 0)));
}

pid_t requireNumber(pid_t process) {
  if (process > 0) return process;
  throw IdentityError("The bus does not know the caller's process; it may run in another PID namespace.");
}

// The number in "KEY:\tNUMBER", or what stands in its place; none when no line begins so.
std::optional<long long> numberAfter(std::string_view key, std::string_view lines) {
  for (std::size_t begin = 0; begin < lines.size();) {
    const std::string_view line = lines.substr(begin, lines.find('\n', begin) - begin);
    begin += line.size() + 1;
    if (!line.starts_with(key)) continue;
    return std::strtoll(std::string(line.substr(key.size())).c_str(), nullptr, 10);
  }
  return std::nullopt;
}

// A pinned process has its number in the information about the descriptor: -1 when it has ended, 0 when it is in another PID
// namespace.
pid_t numberOf(const FileDescriptor& pin) {
  const FileDescriptor info(open(("/proc/self/fdinfo/" + std::to_string(pin.number())).c_str(), O_RDONLY | O_CLOEXEC));
  const auto lines = info.isOpen() ? readAtMost(info, largestStatus) : std::nullopt;
  const auto number = lines ? numberAfter("Pid:", *lines) : std::nullopt;
  if (!number) throw IdentityError("The bus has pinned the caller with something that is no process.");
  if (*number < 0) throw IdentityError("The process that made the caller's connection has ended.");
  return requireNumber(static_cast<pid_t>(*number));
}

}  // namespace

PinnedProcess::PinnedProcess(pid_t process) : PinnedProcess(process, openPin(requireNumber(process))) {}

PinnedProcess::PinnedProcess(std::shared_ptr<const FileDescriptor> pin) : PinnedProcess(numberOf(*pin), pin) {}

PinnedProcess::PinnedProcess(pid_t process, std::shared_ptr<const FileDescriptor> pin)
    : _process(process),
      _pin(std::move(pin)),
      _folder(_pin->isOpen() ? open(("/proc/" + std::to_string(process)).c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC) : -1) {
  if (!_pin->isOpen()) fail("cannot be pinned");
  if (!_folder.isOpen()) fail("is not in /proc");
}

void PinnedProcess::fail(const std::string& what) const {
  const int error = errno;
  throw IdentityError("The caller, process " + std::to_string(_process) + ", " + what + ": " + std::strerror(error) + ".");
}

std::string PinnedProcess::readText(const FileDescriptor& file, std::size_t limit, const std::string& what) const {
  auto text = readAtMost(file, limit);
  if (!text) fail("has " + what + " that cannot be read");
  return *std::move(text);
}

void PinnedProcess::requireAlive() const {
  pollfd pin{.fd = _pin->number(), .events = POLLIN, .revents = 0};
  // The descriptor becomes readable when the process ends, and stays so.
  if (poll(&pin, 1, 0) == 0) return;
  throw IdentityError("The caller, process " + std::to_string(_process) + ", ended while it was being identified.");
}

std::optional<std::string> PinnedProcess::flatpakInfo() const {
  const FileDescriptor root(openat(_folder.number(), "root", O_PATH | O_DIRECTORY | O_CLOEXEC));
  if (!root.isOpen()) fail("has a root folder that cannot be read");
  constexpr int flags = O_RDONLY | O_NOFOLLOW | O_CLOEXEC | O_NONBLOCK | O_NOCTTY;
  const FileDescriptor info(openat(root.number(), ".flatpak-info", flags));
  if (!info.isOpen() && errno == ENOENT) return std::nullopt;
  struct stat status {};
  if (!info.isOpen() || fstat(info.number(), &status) != 0) fail("has a /.flatpak-info that cannot be read");
  if (!S_ISREG(status.st_mode)) throw IdentityError("The caller's /.flatpak-info is no regular file.");
  return readText(info, largestInfo, "a /.flatpak-info");
}

std::optional<std::string> PinnedProcess::securityLabel() const {
  // The first is AppArmor's own file; before it had one, all modules shared the second.
  for (const char* name : {"attr/apparmor/current", "attr/current"}) {
    const FileDescriptor file(openat(_folder.number(), name, O_RDONLY | O_CLOEXEC));
    if (!file.isOpen() && errno == ENOENT) continue;
    if (!file.isOpen()) fail("has a security label that cannot be read");
    auto label = readAtMost(file, largestLabel);
    if (label) return label;
    // A kernel without a security module that is switched on answers so.
    if (errno != EINVAL) fail("has a security label that cannot be read");
  }
  return std::nullopt;
}

std::string PinnedProcess::cgroups() const {
  const FileDescriptor file(openat(_folder.number(), "cgroup", O_RDONLY | O_CLOEXEC));
  if (!file.isOpen()) fail("has cgroups that cannot be read");
  return readText(file, largestCgroups, "cgroups");
}

std::optional<std::string> PinnedProcess::userUnit() const {
  char* text = nullptr;
  const int result = sd_pid_get_user_unit(_process, &text);
  const std::unique_ptr<char, decltype(&std::free)> unit(text, &std::free);
  // No unit, or no service manager at all; the last is the answer where this process sees no /sys/fs/cgroup.
  if (result == -ENODATA || result == -ENOMEDIUM || result == -ENOENT) return std::nullopt;
  errno = -result;
  if (result < 0) fail("has a unit that cannot be found out");
  return unit.get();
}

Program PinnedProcess::program() const {
  const FileDescriptor file(openat(_folder.number(), "exe", O_PATH | O_CLOEXEC));
  struct stat status {};
  if (!file.isOpen() || fstat(file.number(), &status) != 0) fail("runs a program that cannot be found out");
  std::array<char, PATH_MAX> path{};
  const ssize_t length = readlinkat(_folder.number(), "exe", path.data(), path.size());
  if (length <= 0 || static_cast<std::size_t>(length) == path.size()) fail("runs a program whose path cannot be read");
  return {.path = std::string(path.data(), static_cast<std::size_t>(length)),
          .file = {.device = status.st_dev, .inode = status.st_ino}};
}

std::string PinnedProcess::readSmall(const char* name, const std::string& what) const {
  const FileDescriptor file(openat(_folder.number(), name, O_RDONLY | O_CLOEXEC));
  if (!file.isOpen()) fail("has " + what + " that cannot be read");
  return readText(file, largestStatus, what);
}

uid_t PinnedProcess::user() const {
  // Four users stand in the line: the real one, the one whose rights it has, and two more.
  constexpr std::string_view key = "\nUid:\t";
  const std::string status = readSmall("status", "a status");
  const std::size_t line = status.find(key);
  const std::size_t effective = line == std::string::npos ? line : status.find('\t', line + key.size());
  if (effective == std::string::npos) throw IdentityError("The kernel does not say whose process the caller is.");
  return static_cast<uid_t>(std::strtoul(status.c_str() + effective, nullptr, 10));
}

std::uint64_t PinnedProcess::startTick() const {
  // The program's name is the second field and may hold anything, brackets and spaces too; behind it there are only numbers.
  constexpr int fieldsBetween = 20;
  const std::string fields = readSmall("stat", "a state");
  std::size_t place = fields.rfind(')');
  for (int field = 0; field < fieldsBetween && place != std::string::npos; ++field) place = fields.find(' ', place + 1);
  const std::uint64_t start = place == std::string::npos ? 0 : std::strtoull(fields.c_str() + place, nullptr, 10);
  // The first process of the machine alone starts at 0.
  if (start == 0 && _process != 1) throw IdentityError("The kernel does not say when the caller started.");
  return start;
}

}  // namespace palisade
