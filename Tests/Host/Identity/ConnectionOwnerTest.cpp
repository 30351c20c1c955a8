#include "Host/Identity/ConnectionOwner.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <sys/un.h>
#include <unistd.h>

#include <cerrno>
#include <chrono>
#include <cstddef>
#include <cstring>
#include <filesystem>
#include <optional>
#include <stdexcept>
#include <vector>

#include "Host/Identity/BusSockets.h"
#include "Tests/Host/Identity/Identify.h"
#include "Tests/Host/TemporaryFolder.h"

namespace palisade {
namespace {

using testing::HasSubstr;
using Names = std::vector<std::string>;

// How often this process is connected to a listener of its own, as a caller is to the bus.
class Listener {
 public:
  explicit Listener(const std::string& address) : _address(address), _listener(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0)) {
    const auto name = socketAddress();
    const bool listens = bind(_listener.number(), pointer(name), length()) == 0 && listen(_listener.number(), 16) == 0;
    if (!listens) throw std::runtime_error(std::strerror(errno));
  }

  FileDescriptor connectOnce() const {
    FileDescriptor connected(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    const auto name = socketAddress();
    if (connect(connected.number(), pointer(name), length()) != 0) throw std::runtime_error(std::strerror(errno));
    return connected;
  }

  const std::string& address() const { return _address; }

  FileDescriptor acceptOnce() const { return FileDescriptor(accept4(_listener.number(), nullptr, nullptr, SOCK_CLOEXEC)); }

 private:
  static const sockaddr* pointer(const sockaddr_un& name) { return reinterpret_cast<const sockaddr*>(&name); }
  socklen_t length() const { return static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + _address.size()); }

  sockaddr_un socketAddress() const {
    sockaddr_un name{};
    name.sun_family = AF_UNIX;
    _address.copy(name.sun_path, sizeof(name.sun_path) - 1);
    return name;
  }

  std::string _address;
  FileDescriptor _listener;
};

FileDescriptor ownFolder() { return FileDescriptor(open("/proc/self", O_PATH | O_DIRECTORY | O_CLOEXEC)); }

std::size_t countSocketsToBus(const std::string& address, pid_t busProcess, std::size_t enough) {
  return socketsToBus(ownFolder(), address, busProcess, enough).value().size();
}

TEST(TheSocketsToTheBus, AreCountedByTheirOtherEnd) {
  const TemporaryFolder folder;
  for (const std::string& address :
       {(folder.path() / "bus").string(), std::string("\0palisade-test.", 15) + folder.path().string()}) {
    const Listener bus(address);
    const Listener stranger(address + "x");
    EXPECT_EQ(countSocketsToBus(address, 0, 9), 0U);
    const FileDescriptor one = bus.connectOnce();
    const FileDescriptor another = bus.connectOnce();
    const FileDescriptor elsewhere = stranger.connectOnce();
    // The listener's own ends are connected too, with sockets that have no address.
    const FileDescriptor takenOne = bus.acceptOnce();
    const FileDescriptor takenAnother = bus.acceptOnce();
    const FileDescriptor takenElsewhere = stranger.acceptOnce();
    // Nobody has answered this one.
    const FileDescriptor waiting = bus.connectOnce();
    EXPECT_EQ(countSocketsToBus(address, 0, 9), 2U);
    EXPECT_EQ(countSocketsToBus(address, 0, 1), 1U);
    EXPECT_EQ(countSocketsToBus("", 0, 9), 0U);
  }
}

TEST(TheSocketsToTheBus, AreThoseThatItsProcessHoldsWhateverTheirAddress) {
  const TemporaryFolder folder;
  const Listener bus((folder.path() / "other").string());
  const FileDescriptor connected = bus.connectOnce();
  const FileDescriptor taken = bus.acceptOnce();
  // Either end is the other's, and both are this process's.
  EXPECT_EQ(countSocketsToBus("/run/bus", getpid(), 9), 2U);
}

class AConnectionOfACaller : public testing::Test {
 protected:
  void expectRefusal(const CallingConnection& described, const std::string& sentence) const {
    try {
      requireOwnConnection(processBehind(described), described);
      ADD_FAILURE() << "not refused: " << sentence;
    } catch (const NotItsConnection& error) {
      EXPECT_THAT(error.what(), HasSubstr(sentence));
    }
  }

  static void expectItsOwn(const CallingConnection& described) { requireOwnConnection(processBehind(described), described); }

  const CallerProcess caller{{CALLER_PROGRAM}};
  CallingConnection connection = connectionOf(caller.pid());
  const std::uint64_t start = PinnedProcess(caller.pid()).startTick();
};

TEST_F(AConnectionOfACaller, IsItsOwnWhenTheCallerStartedInTheSameTickOrBefore) {
  for (const std::uint64_t later : {0U, 1U, 1000U}) {
    connection.existedAt = start + later;
    expectItsOwn(connection);
  }
}

TEST_F(AConnectionOfACaller, IsNotItsOwnWhenItIsOlderThanTheCaller) {
  connection.existedAt = start - 1;
  expectRefusal(connection, "has ended; another one has its number");
}

TEST_F(AConnectionOfACaller, IsNotItsOwnWhenTheBusGoesOnToCountMoreThanItHas) {
  connection.listConnections = [&](std::uint64_t sinceTick) {
    EXPECT_EQ(sinceTick, start);
    return Names{":1.5", ":1.6"};
  };
  std::vector<Names> waits;
  connection.awaitEnd = [&](const Names& names, std::chrono::steady_clock::time_point deadline) {
    EXPECT_GT(deadline, std::chrono::steady_clock::now() + std::chrono::seconds(1));
    EXPECT_LE(deadline, std::chrono::steady_clock::now() + std::chrono::seconds(2));
    waits.push_back(names);
    return Names{":1.5"};
  };
  connection.confirm = [](const Names&, std::uint64_t) { ADD_FAILURE() << "confirmed"; };
  expectRefusal(connection, "The bus counts more connections for process " + std::to_string(caller.pid()) + " than it has");
  EXPECT_THAT(waits, testing::ElementsAre(Names{":1.5", ":1.6"}, Names{":1.5"}));
}

TEST_F(AConnectionOfACaller, IsItsOwnWhenTheBusNoticesThatItsOtherConnectionsHaveEnded) {
  connection.listConnections = [](std::uint64_t) { return Names{":1.5", ":1.6"}; };
  connection.awaitEnd = [](const Names& names, auto) { return Names(names.begin() + 1, names.end()); };
  expectItsOwn(connection);
}

// This process is the caller, and the listener is the bus.
class ACallerWithSockets : public AConnectionOfACaller {
 protected:
  ACallerWithSockets() {
    connection = connectionOf(getpid());
    // Not this process, which holds both ends.
    connection.busProcess = caller.pid();
    connection.busAddress = bus.address();
  }

  const Listener bus{std::string("\0palisade-test.", 15) + std::to_string(getpid())};
};

TEST_F(ACallerWithSockets, DoesNotOwnAConnectionByASocketThatItGainsWhileTheBusIsWaitedFor) {
  std::vector<FileDescriptor> gained;
  connection.listConnections = [](std::uint64_t) { return Names{":1.5", ":1.6"}; };
  connection.awaitEnd = [&](const Names& names, auto) {
    gained.push_back(bus.connectOnce());
    gained.push_back(bus.acceptOnce());
    return Names{names.back()};
  };
  expectRefusal(connection, "counts more connections");
  EXPECT_EQ(gained.size(), 4U);
}

TEST_F(ACallerWithSockets, DoesNotOwnAConnectionByASocketThatItClosesWhileTheBusIsWaitedFor) {
  auto closed = std::make_optional(bus.connectOnce());
  const FileDescriptor taken = bus.acceptOnce();
  connection.listConnections = [](std::uint64_t) { return Names{":1.5", ":1.6"}; };
  connection.awaitEnd = [&](const Names& names, auto) {
    closed.reset();
    return Names{names.back()};
  };
  expectRefusal(connection, "counts more connections");
}

TEST_F(ACallerWithSockets, OwnsItsConnectionWhenItClosesAnotherOneBetweenTheTwoLooks) {
  const FileDescriptor kept = bus.connectOnce();
  const FileDescriptor taken = bus.acceptOnce();
  connection.listConnections = [](std::uint64_t) { return Names{":1.5", ":1.6"}; };
  connection.awaitEnd = [](const Names& names, auto) { return Names{names.back()}; };
  Names confirmed;
  connection.confirm = [&](const Names& names, std::uint64_t) { confirmed = names; };
  expectItsOwn(connection);
  EXPECT_THAT(confirmed, testing::ElementsAre(":1.6"));
}

TEST_F(ACallerWithSockets, IsExaminedOnceWithAllItsConnections) {
  const FileDescriptor one = bus.connectOnce();
  const FileDescriptor another = bus.connectOnce();
  const FileDescriptor takenOne = bus.acceptOnce();
  const FileDescriptor takenAnother = bus.acceptOnce();
  connection.listConnections = [](std::uint64_t) { return Names{":1.5", ":1.6"}; };
  Names confirmed;
  connection.confirm = [&](const Names& names, std::uint64_t startTick) {
    confirmed = names;
    connection.ownerStart = startTick;
  };
  expectItsOwn(connection);
  EXPECT_THAT(confirmed, testing::ElementsAre(":1.5", ":1.6"));

  connection.listConnections = [](std::uint64_t) { return Names{":1.5", ":1.6", ":1.7"}; };
  expectItsOwn(connection);
  // What was found about another process says nothing about this one.
  ++*connection.ownerStart;
  expectRefusal(connection, "counts more connections");
}

TEST_F(AConnectionOfACaller, OfAnotherUserIsRefused) {
  connection.user = geteuid() + 1;
  EXPECT_THAT([&] { expectItsOwn(connection); }, testing::ThrowsMessage<IdentityError>(HasSubstr("belongs to another user")));
}

TEST_F(AConnectionOfACaller, IsNotItsOwnUnderAnotherSecurityLabel) {
  connection.securityLabel = std::string("snap.photos.viewer (enforce)\0", 29);
  expectRefusal(connection, "'snap.photos.viewer'");
}

TEST_F(AConnectionOfACaller, IsItsOwnUnderItsSecurityLabel) {
  const auto label = PinnedProcess(caller.pid()).securityLabel();
  if (!label) GTEST_SKIP() << "No security module is switched on here.";
  connection.securityLabel = *label + '\0';
  expectItsOwn(connection);
}

TEST_F(AConnectionOfACaller, ThatTheBusHasPinnedNeedsNoOtherSign) {
  connection.pin = std::make_shared<const FileDescriptor>(static_cast<int>(syscall(SYS_pidfd_open, caller.pid(), 0)));
  connection.existedAt = 0;
  connection.listConnections = [](std::uint64_t) { return Names{":1.5"}; };
  expectItsOwn(connection);
}

TEST(AConnectionThatTheBusHasPinned, IsRefusedWhenItsProcessHasEnded) {
  CallerProcess caller({CALLER_PROGRAM});
  auto connection = connectionOf(caller.pid());
  connection.pin = std::make_shared<const FileDescriptor>(static_cast<int>(syscall(SYS_pidfd_open, caller.pid(), 0)));
  caller.wait();
  // Another process has the number now.
  connection.process = getpid();
  EXPECT_THAT([&] { processBehind(connection); },
              testing::ThrowsMessage<IdentityError>("The process that made the caller's connection has ended."));
}

TEST(AConnectionThatTheBusHasPinned, WithSomethingThatIsNoProcessIsRefused) {
  auto connection = connectionOf(getpid());
  connection.pin = std::make_shared<const FileDescriptor>(open("/dev/null", O_RDONLY | O_CLOEXEC));
  EXPECT_THAT([&] { processBehind(connection); }, testing::ThrowsMessage<IdentityError>(HasSubstr("no process")));
}

TEST(SecurityLabels, AreTheSameWhateverStandsBehindThem) {
  const std::string label = "snap.photos.viewer";
  for (const std::string& one : {label, label + " (enforce)", label + " (complain)\n", label + std::string(1, '\0')}) {
    for (const std::string& other : {label + "\n", label + " (enforce)" + std::string(1, '\0')}) {
      EXPECT_TRUE(isSameSecurityLabel(one, other)) << one << other;
    }
    for (const char* other : {"", "snap.photos.viewe", "snap.photos.viewer.more", "unconfined", "(enforce)"}) {
      EXPECT_FALSE(isSameSecurityLabel(one, other)) << one << other;
    }
  }
}

}  // namespace
}  // namespace palisade
