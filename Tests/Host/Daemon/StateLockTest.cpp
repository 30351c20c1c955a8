#include "Host/Daemon/StateLock.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <chrono>
#include <filesystem>
#include <fstream>
#include <optional>
#include <stdexcept>
#include <system_error>
#include <utility>

#include "Tests/Host/TemporaryFolder.h"

namespace palisade {
namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::ThrowsMessage;

constexpr const char* accountDaemon = "accountd";
constexpr std::chrono::milliseconds noPatience{0};
constexpr std::chrono::minutes muchPatience{5};

std::array<int, 2> pipeEnds() {
  std::array<int, 2> ends{};
  if (pipe(ends.data()) != 0) throw std::system_error(errno, std::generic_category(), "pipe");
  return ends;
}

// Another process that has the lock until it is killed, or told to end.
class OtherDaemon {
 public:
  explicit OtherDaemon(const std::filesystem::path& folder) : _ready(pipeEnds()), _ending(pipeEnds()), _process(fork()) {
    if (_process == 0) holdLock(folder);
    char byte = 0;
    close(_ready[1]);
    if (read(_ready[0], &byte, 1) != 1) throw std::runtime_error("The other process has no lock.");
  }
  OtherDaemon(const OtherDaemon&) = delete;
  OtherDaemon& operator=(const OtherDaemon&) = delete;
  ~OtherDaemon() {
    end();
    waitpid(_process, nullptr, 0);
    close(_ready[0]);
    close(_ending[0]);
  }

  void end() {
    if (const int writer = std::exchange(_ending[1], -1); writer >= 0) close(writer);
  }
  void killHard() const { kill(_process, SIGKILL); }

 private:
  // Never throws, lest the child go on with the tests.
  [[noreturn]] void holdLock(const std::filesystem::path& folder) noexcept {
    close(_ending[1]);
    const StateLock lock(folder, accountDaemon, muchPatience);
    if (write(_ready[1], "r", 1) != 1) _exit(1);
    char byte = 0;
    // Ends with the last writer, so also when the test fails.
    while (read(_ending[0], &byte, 1) > 0) {
    }
    _exit(0);
  }

  std::array<int, 2> _ready;
  std::array<int, 2> _ending;
  pid_t _process;
};

class State : public testing::Test {
 protected:
  const TemporaryFolder temporary;
  const std::filesystem::path folder = temporary.path() / "state" / "palisade";
};

TEST_F(State, GetsAFolderForItsOwnerAlone) {
  const StateLock lock(folder, accountDaemon, noPatience);
  struct stat status {};
  ASSERT_EQ(stat(folder.c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 0777U, 0700U);
}

TEST_F(State, IsRefusedWhileAnotherDaemonWorksOnIt) {
  const OtherDaemon other(folder);
  EXPECT_THAT(
      [&] { StateLock(folder, accountDaemon, noPatience); },
      ThrowsMessage<StateIsTaken>(AllOf(HasSubstr(folder.string()), HasSubstr("End that one"), HasSubstr("XDG_STATE_HOME"))));
}

TEST_F(State, IsForOneDaemonOfEachKind) {
  const OtherDaemon other(folder);
  EXPECT_NO_THROW(StateLock(folder, "vantad", noPatience));
}

TEST_F(State, IsWaitedForUntilTheOtherDaemonHasEnded) {
  std::optional<OtherDaemon> other(std::in_place, folder);
  const pid_t waiting = fork();
  ASSERT_GE(waiting, 0);
  if (waiting == 0) {
    // Has to be without its parent's end of the pipe: the other daemon ends with the last of them.
    other->end();
    try {
      const StateLock lock(folder, accountDaemon, muchPatience);
      _exit(0);
    } catch (const std::runtime_error&) {
      _exit(1);
    }
  }
  EXPECT_EQ(waitpid(waiting, nullptr, WNOHANG), 0);
  other.reset();
  int status = -1;
  ASSERT_EQ(waitpid(waiting, &status, 0), waiting);
  EXPECT_EQ(status, 0);
}

TEST_F(State, IsFreeAgainWhenItsDaemonIsKilled) {
  const OtherDaemon other(folder);
  other.killHard();
  EXPECT_NO_THROW(StateLock(folder, accountDaemon, muchPatience));
}

TEST_F(State, IsFreeAgainWhenTheLockIsGone) {
  { const StateLock lock(folder, accountDaemon, noPatience); }
  EXPECT_NO_THROW(StateLock(folder, accountDaemon, noPatience));
}

TEST_F(State, OfAnotherFolderIsNotInTheWay) {
  const OtherDaemon other(folder);
  EXPECT_NO_THROW(StateLock(temporary.path() / "another", accountDaemon, noPatience));
}

TEST_F(State, IsRefusedWhenItsLockIsALink) {
  std::filesystem::create_directories(folder);
  const std::filesystem::path target = temporary.path() / "target";
  std::filesystem::create_symlink(target, folder / "accountd.lock");
  EXPECT_THAT(
      [&] { StateLock(folder, accountDaemon, noPatience); },
      ThrowsMessage<std::runtime_error>(AllOf(HasSubstr((folder / "accountd.lock").string()), HasSubstr("cannot be opened"))));
  EXPECT_FALSE(std::filesystem::exists(target));
}

TEST_F(State, IsRefusedWhereThereCanBeNoFolder) {
  std::ofstream(temporary.path() / "state") << "no folder";
  EXPECT_THROW(StateLock(folder, accountDaemon, noPatience), std::runtime_error);
}

}  // namespace
}  // namespace palisade
