#include "Host/Alert/HelperProcess.h"

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/eventfd.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <string_view>
#include <vector>

#include "Host/Alert/AlertAnswer.h"

namespace palisade {
namespace {

/// How long a helper may take to leave once it has answered.
constexpr std::chrono::seconds longestFarewell(1);

// What a window needs to find its display, its fonts and its language. Whatever would load a module into the helper stays out.
constexpr std::array<std::string_view, 26> handedOn = {"AT_SPI_BUS_ADDRESS",
                                                       "DBUS_SESSION_BUS_ADDRESS",
                                                       "DISPLAY",
                                                       "GDK_BACKEND",
                                                       "GDK_DPI_SCALE",
                                                       "GDK_SCALE",
                                                       "GSETTINGS_BACKEND",
                                                       "GTK_THEME",
                                                       "HOME",
                                                       "LANG",
                                                       "LANGUAGE",
                                                       "LC_ALL",
                                                       "LC_CTYPE",
                                                       "LC_MESSAGES",
                                                       "NO_AT_BRIDGE",
                                                       "PATH",
                                                       "USER",
                                                       "WAYLAND_DISPLAY",
                                                       "XAUTHORITY",
                                                       "XDG_CACHE_HOME",
                                                       "XDG_CONFIG_HOME",
                                                       "XDG_CURRENT_DESKTOP",
                                                       "XDG_DATA_DIRS",
                                                       "XDG_DATA_HOME",
                                                       "XDG_RUNTIME_DIR",
                                                       "XDG_SESSION_TYPE"};
static_assert(std::ranges::is_sorted(handedOn));

std::vector<char*> environmentOfHelper() {
  std::vector<char*> kept;
  for (char** entry = environ; *entry != nullptr; ++entry) {
    const std::string_view text = *entry;
    if (std::ranges::binary_search(handedOn, text.substr(0, text.find('=')))) kept.push_back(*entry);
  }
  kept.push_back(nullptr);
  return kept;
}

// The two C structures that say how a process is started.
class SpawnPlan {
 public:
  explicit SpawnPlan(int socket) {
    posix_spawn_file_actions_init(&_files);
    posix_spawn_file_actions_adddup2(&_files, socket, HelperProcess::helperSocket);
    posix_spawn_file_actions_addopen(&_files, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
    posix_spawn_file_actions_addopen(&_files, STDOUT_FILENO, "/dev/null", O_WRONLY, 0);
    posix_spawn_file_actions_addclosefrom_np(&_files, HelperProcess::helperSocket + 1);

    // The daemon's threads block and ignore signals that are to end the helper. A group of its own keeps the terminal's
    // interrupts away from it.
    sigset_t none;
    sigset_t all;
    sigemptyset(&none);
    sigfillset(&all);
    posix_spawnattr_init(&_attributes);
    posix_spawnattr_setsigmask(&_attributes, &none);
    posix_spawnattr_setsigdefault(&_attributes, &all);
    posix_spawnattr_setpgroup(&_attributes, 0);
    posix_spawnattr_setflags(&_attributes, POSIX_SPAWN_SETSIGMASK | POSIX_SPAWN_SETSIGDEF | POSIX_SPAWN_SETPGROUP);
  }
  SpawnPlan(const SpawnPlan&) = delete;
  SpawnPlan& operator=(const SpawnPlan&) = delete;
  ~SpawnPlan() {
    posix_spawnattr_destroy(&_attributes);
    posix_spawn_file_actions_destroy(&_files);
  }

  const posix_spawn_file_actions_t* files() const { return &_files; }
  const posix_spawnattr_t* attributes() const { return &_attributes; }

 private:
  posix_spawn_file_actions_t _files;
  posix_spawnattr_t _attributes;
};

}  // namespace

std::unique_ptr<HelperProcess> HelperProcess::start(const std::filesystem::path& program, const std::string& questionFrame) {
  int ends[2];
  if (socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, ends) != 0) return nullptr;
  FileDescriptor ours(ends[0]);
  const FileDescriptor theirs(ends[1]);
  FileDescriptor takenDown(eventfd(0, EFD_CLOEXEC));
  if (!takenDown.isOpen()) return nullptr;

  const SpawnPlan plan(theirs.number());
  std::string name = program.string();
  char* arguments[] = {name.data(), nullptr};
  std::vector<char*> variables = environmentOfHelper();
  pid_t process = -1;
  const int failure = posix_spawn(&process, name.c_str(), plan.files(), plan.attributes(), arguments, variables.data());
  if (failure != 0) {
    errno = failure;
    return nullptr;
  }
  // Nobody else reaps this child, so the number is still its own.
  FileDescriptor handle(static_cast<int>(syscall(SYS_pidfd_open, process, 0)));
  const bool hasHandle = handle.isOpen();
  std::unique_ptr<HelperProcess> helper(new HelperProcess(process, std::move(handle), std::move(ours), std::move(takenDown)));
  if (!hasHandle) return nullptr;
  // The frame fits into the socket's buffer. A helper that has gone already is one that will not answer.
  static_cast<void>(send(helper->_socket.number(), questionFrame.data(), questionFrame.size(), MSG_NOSIGNAL | MSG_DONTWAIT));
  return helper;
}

HelperProcess::~HelperProcess() {
  if (_process < 0) return;
  kill(_process, SIGKILL);
  reap();
}

void HelperProcess::takeDown() const { eventfd_write(_takenDown.number(), 1); }

HelperProcess::Ending HelperProcess::waitForEnd(Deadline deadline) {
  Ending ending;
  bool isOpen = true;
  while (true) {
    // A negative descriptor is passed over.
    pollfd sources[] = {{.fd = _takenDown.number(), .events = POLLIN, .revents = 0},
                        {.fd = _processHandle.number(), .events = POLLIN, .revents = 0},
                        {.fd = isOpen ? _socket.number() : -1, .events = POLLIN, .revents = 0}};
    const int ready = poll(sources, std::size(sources), millisecondsLeft(deadline));
    if (ready < 0 && errno == EINTR) continue;
    if (ready <= 0 || sources[0].revents != 0) return ending;
    if (sources[2].revents != 0) {
      const bool hadAnswer = !ending.received.empty();
      isOpen = readAnswer(ending.received);
      if (ending.received.size() > alertAnswerSize) return ending;
      if (!hadAnswer || !isOpen) deadline = std::min(deadline, Clock::now() + longestFarewell);
    }
    if (sources[1].revents != 0) {
      // What it wrote before it ended is still in the socket.
      while (isOpen && ending.received.size() <= alertAnswerSize) isOpen = readAnswer(ending.received);
      ending.waitStatus = reap();
      return ending;
    }
  }
}

// False when there is nothing more to come.
bool HelperProcess::readAnswer(std::string& received) const {
  char buffer[alertAnswerSize + 1];
  const ssize_t length = recv(_socket.number(), buffer, sizeof buffer, MSG_DONTWAIT);
  if (length < 0 && errno == EINTR) return true;
  if (length > 0) received.append(buffer, static_cast<std::size_t>(length));
  return length > 0;
}

int HelperProcess::reap() {
  int status = -1;
  while (waitpid(_process, &status, 0) < 0 && errno == EINTR) continue;
  _process = -1;
  return status;
}

}  // namespace palisade
