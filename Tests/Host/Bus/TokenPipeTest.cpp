#include "Host/Bus/TokenPipe.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <atomic>
#include <csignal>
#include <cstdlib>
#include <future>
#include <thread>
#include <vector>

#include "Host/Bus/AccountsService.h"
#include "Tests/Host/TemporaryFolder.h"

namespace palisade {
namespace {

using testing::HasSubstr;

class APipeWithAToken : public testing::Test {
 protected:
  static constexpr std::chrono::milliseconds ordinaryLimit{500};

  APipeWithAToken() { EXPECT_EQ(pipe2(_ends, O_CLOEXEC), 0); }
  ~APipeWithAToken() override {
    close(_ends[0]);
    endWriting();
  }

  int reader() const { return _ends[0]; }
  int writer() const { return _ends[1]; }
  void endWriting() {
    if (_ends[1] >= 0) close(_ends[1]);
    _ends[1] = -1;
  }
  void write(std::string_view text) const {
    ASSERT_EQ(::write(writer(), text.data(), text.size()), static_cast<ssize_t>(text.size()));
  }

  // What the descriptor brings, or the sentence with which it is refused. One that holds the thread fails the test; the end of
  // the pipe lets it go.
  std::string received(int descriptor, std::chrono::milliseconds limit = ordinaryLimit) {
    auto result = std::async(std::launch::async, [descriptor, limit] {
      try {
        return readToEnd(sdbus::UnixFd(descriptor), limit);
      } catch (const BusFailure& failure) {
        return std::string(failure.what());
      }
    });
    if (result.wait_for(10 * ordinaryLimit) != std::future_status::ready) {
      ADD_FAILURE() << "the thread is held";
      endWriting();
    }
    return result.get();
  }

 private:
  int _ends[2] = {-1, -1};
};

TEST_F(APipeWithAToken, IsReadToItsEnd) {
  const std::string token(40'000, 't');
  write(token);
  endWriting();
  EXPECT_EQ(received(reader()), token);
}

TEST_F(APipeWithAToken, MayBringItInPieces) {
  std::jthread slow([this] {
    for (const char* piece : {"a", "-", "token"}) write(piece);
    endWriting();
  });
  EXPECT_EQ(received(reader()), "a-token");
}

TEST_F(APipeWithAToken, ThatIsTooLongIsRefused) {
  std::jthread endless([this] {
    std::signal(SIGPIPE, SIG_IGN);
    const std::string much(4096, 't');
    for (int part = 0; part < 17; ++part) write(much);
    endWriting();
  });
  EXPECT_THAT(received(reader()), HasSubstr("longer than 64 KiB"));
  std::array<char, 4096> rest{};
  while (::read(reader(), rest.data(), rest.size()) > 0) {
  }
}

TEST_F(APipeWithAToken, ThatIsNeverClosedIsGivenUp) {
  write("token");
  EXPECT_THAT(received(reader()), HasSubstr("did not come to its end"));
}

TEST_F(APipeWithAToken, ThatSomebodyElseEmptiesHoldsNoThread) {
  // What is there when the pipe is looked at is gone when it is read: the sender has the same end of it.
  std::vector<std::jthread> thieves;
  for (int thief = 0; thief < 4; ++thief) {
    thieves.emplace_back([this] {
      char stolen = 0;
      while (::read(reader(), &stolen, 1) > 0) {
      }
    });
  }
  for (int round = 0; round < 400 && !HasFailure(); ++round) {
    std::jthread sender([this] { write("t"); });
    EXPECT_THAT(received(reader(), std::chrono::milliseconds(5)), HasSubstr("did not come to its end"));
  }
  endWriting();
}

TEST_F(APipeWithAToken, HasToBeOne) {
  const TemporaryFolder folder;
  int sockets[2];
  ASSERT_EQ(socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, sockets), 0);
  const int terminal = posix_openpt(O_RDWR | O_NOCTTY | O_CLOEXEC);
  for (const int descriptor :
       {sockets[0], terminal, open("/dev/zero", O_RDONLY | O_CLOEXEC),
        open(folder.path().c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC), open(folder.path().c_str(), O_PATH | O_CLOEXEC),
        open("/proc/self/cmdline", O_RDONLY | O_CLOEXEC)}) {
    ASSERT_GE(descriptor, 0);
    EXPECT_THAT(received(descriptor), HasSubstr("in a pipe"));
    close(descriptor);
  }
  close(sockets[1]);
}

TEST_F(APipeWithAToken, MayHaveAName) {
  const TemporaryFolder folder;
  const auto path = folder.path() / "pipe";
  ASSERT_EQ(mkfifo(path.c_str(), 0600), 0);
  const int both = open(path.c_str(), O_RDWR | O_CLOEXEC);
  ASSERT_EQ(::write(both, "token", 5), 5);
  const int reading = open(path.c_str(), O_RDONLY | O_CLOEXEC);
  close(both);
  EXPECT_EQ(received(reading), "token");
  close(reading);
}

TEST(APipeForAToken, HoldsItToItsEnd) { EXPECT_EQ(readToEnd(pipeHolding("token")), "token"); }

}  // namespace
}  // namespace palisade
