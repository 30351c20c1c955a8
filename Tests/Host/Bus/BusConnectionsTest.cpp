#include "Host/Bus/BusConnections.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <csignal>
#include <future>
#include <map>

#include "Host/Identity/PinnedProcess.h"

namespace palisade {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::UnorderedElementsAre;
using Connection = BusConnections::Connection;

constexpr pid_t photos = 41;
constexpr pid_t album = 42;

class TheConnectionsOfABus : public testing::Test {
 protected:
  std::optional<pid_t> answer(const std::string& name) {
    asked.push_back(name);
    const auto found = processes.find(name);
    if (found == processes.end()) return std::nullopt;
    return found->second;
  }

  std::uint64_t now = 1000;
  std::map<std::string, pid_t> processes;
  std::vector<std::string> asked;
  BusConnections connections{[this](const std::string& name) { return answer(name); }, [this] { return now; }};
};

TEST_F(TheConnectionsOfABus, ExistedWhenTheyWereAnnounced) {
  connections.appeared(":1.5");
  now = 1001;
  connections.appeared(":1.6");
  EXPECT_EQ(connections.find(":1.5"), (Connection{.existedAt = 1000, .isOlderThanDaemon = false}));
  EXPECT_EQ(connections.find(":1.6"), (Connection{.existedAt = 1001, .isOlderThanDaemon = false}));
}

TEST_F(TheConnectionsOfABus, ThatWereThereBeforeTheDaemonExistedAtItsStart) {
  connections.wereThere({":1.0", "org.example.Photos", ":1.7"});
  now = 2000;
  // The announcement was under way when the list came.
  connections.appeared(":1.7");
  EXPECT_EQ(connections.find(":1.0"), (Connection{.existedAt = 1000, .isOlderThanDaemon = true}));
  EXPECT_EQ(connections.find(":1.7"), (Connection{.existedAt = 1000, .isOlderThanDaemon = true}));
}

TEST_F(TheConnectionsOfABus, AreForgottenWhenTheyEnd) {
  connections.wereThere({":1.0"});
  connections.appeared(":1.5");
  for (const char* name : {":1.0", ":1.5", ":1.6"}) {
    connections.vanished(name);
    EXPECT_EQ(connections.find(name), std::nullopt) << name;
  }
}

TEST_F(TheConnectionsOfABus, AreNoNamesOfServices) {
  connections.wereThere({"org.example.Photos"});
  connections.appeared("org.example.Album");
  EXPECT_EQ(connections.find("org.example.Photos"), std::nullopt);
  EXPECT_EQ(connections.find("org.example.Album"), std::nullopt);
  EXPECT_THAT(connections.madeBy(photos, 0), IsEmpty());
}

TEST_F(TheConnectionsOfABus, AreCountedByTheProcessThatTheBusNames) {
  processes = {{":1.1", photos}, {":1.2", album}, {":1.3", photos}};
  connections.wereThere({":1.1", ":1.2"});
  connections.appeared(":1.3");
  EXPECT_THAT(connections.madeBy(photos, 0), UnorderedElementsAre(":1.1", ":1.3"));
  EXPECT_THAT(asked, UnorderedElementsAre(":1.1", ":1.2", ":1.3"));
  asked.clear();
  EXPECT_THAT(connections.madeBy(album, 0), UnorderedElementsAre(":1.2"));
  EXPECT_THAT(asked, IsEmpty()) << "the process behind a connection does not change";
}

TEST_F(TheConnectionsOfABus, ThatExistedBeforeTheProcessStartedAreNotCountedForIt) {
  processes = {{":1.1", photos}, {":1.2", photos}, {":1.3", photos}};
  connections.appeared(":1.1");
  now = 1001;
  connections.appeared(":1.2");
  now = 1002;
  connections.appeared(":1.3");
  EXPECT_THAT(connections.madeBy(photos, 1001), UnorderedElementsAre(":1.2", ":1.3"))
      << "in the tick of its start it may have connected";
  EXPECT_THAT(asked, UnorderedElementsAre(":1.2", ":1.3"));
}

TEST_F(TheConnectionsOfABus, ThatHaveEndedAreLeftOutAtOnce) {
  for (const char* name : {":1.1", ":1.2", ":1.3"}) connections.appeared(name);
  connections.vanished(":1.2");
  EXPECT_THAT(connections.awaitEnd({":1.1", ":1.2", ":1.3"}, std::chrono::steady_clock::time_point::max()),
              ElementsAre(":1.1", ":1.3"));
}

TEST_F(TheConnectionsOfABus, AreWaitedForUntilOneOfThemHasEnded) {
  for (const char* name : {":1.1", ":1.2", ":1.3"}) connections.appeared(name);
  auto left = std::async(std::launch::async, [&] {
    return connections.awaitEnd({":1.1", ":1.2"}, std::chrono::steady_clock::time_point::max());
  });
  connections.vanished(":1.3");
  EXPECT_EQ(left.wait_for(std::chrono::milliseconds(20)), std::future_status::timeout) << "another connection has ended";
  connections.vanished(":1.1");
  EXPECT_THAT(left.get(), ElementsAre(":1.2"));
}

TEST_F(TheConnectionsOfABus, AreWaitedForUntilTheBusDoesNotKnowOneOfThem) {
  connections.appeared(":1.1");
  auto left = std::async(std::launch::async,
                         [&] { return connections.awaitEnd({":1.1"}, std::chrono::steady_clock::time_point::max()); });
  EXPECT_THAT(connections.madeBy(photos, 0), IsEmpty());
  EXPECT_THAT(left.get(), IsEmpty());
}

TEST_F(TheConnectionsOfABus, AreAllLeftWhenTheDeadlineComesFirst) {
  connections.appeared(":1.1");
  EXPECT_THAT(connections.awaitEnd({":1.1"}, std::chrono::steady_clock::now()), ElementsAre(":1.1"));
}

TEST_F(TheConnectionsOfABus, AreRememberedAsAProcesssOwn) {
  connections.appeared(":1.1");
  connections.appeared(":1.2");
  connections.confirm({":1.1", ":1.3"}, 900);
  EXPECT_EQ(connections.find(":1.1")->ownerStart, 900U);
  EXPECT_EQ(connections.find(":1.2")->ownerStart, std::nullopt);
  EXPECT_EQ(connections.find(":1.3"), std::nullopt);
}

TEST(TheClockOfConnections, IsTheOneOfProcesses) {
  const std::uint64_t before = clockTicksSinceBoot();
  const pid_t child = fork();
  if (child == 0) {
    pause();
    _exit(0);
  }
  const std::uint64_t after = clockTicksSinceBoot();
  const std::uint64_t start = PinnedProcess(child).startTick();
  kill(child, SIGKILL);
  waitpid(child, nullptr, 0);
  EXPECT_LE(before, start);
  EXPECT_LE(start, after);
}

}  // namespace
}  // namespace palisade
