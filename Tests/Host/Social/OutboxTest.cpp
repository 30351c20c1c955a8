#include "Host/Vantad/Outbox.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <thread>

#include "Host/Vantad/FileWatch.h"
#include "Tests/Host/TemporaryFolder.h"

using namespace palisade;
using namespace std::chrono_literals;
using testing::AllOf;
using testing::ElementsAre;
using testing::Field;
using testing::IsEmpty;
using testing::SizeIs;

namespace {

class AnOutbox : public testing::Test {
 protected:
  Outbox open() {
    return Outbox({.path = _folder.path() / "outbox.sqlite", .clock = [this] { return now; }});
  }

  Moment now = {.date = Date(1'700'000'000s), .boot = "a boot", .uptime = 5000ms};
  TemporaryFolder _folder;
};

TEST_F(AnOutbox, KeepsWhatWasAddedInOrderThroughARestart) {
  open().add("account", "first");
  open().add("account", "second");
  Outbox outbox = open();
  EXPECT_THAT(outbox.pending(),
              ElementsAre(AllOf(Field(&Invalidation::accountID, "account"), Field(&Invalidation::appID, "first")),
                          Field(&Invalidation::appID, "second")));
  const Invalidation first = outbox.pending().front();
  EXPECT_EQ(first.state, InvalidationState::pending);
  EXPECT_EQ(first.requested.date, now.date);
  EXPECT_EQ(first.requested.boot, now.boot);
  EXPECT_EQ(first.requested.uptime, now.uptime);
  EXPECT_EQ(first.attempts, 0);
  EXPECT_EQ(first.nextAttemptAt, std::nullopt);
  EXPECT_EQ(first.lastError, std::nullopt);
}

TEST_F(AnOutbox, KeepsEveryByteOfAnAppID) {
  Outbox outbox = open();
  const std::string appID = "7'; DROP TABLE \xC3\xA9 -- ";
  outbox.add("account", appID);
  EXPECT_EQ(outbox.pending().front().appID, appID);
}

TEST_F(AnOutbox, NotesWhyAnEntryWaitsAndUntilWhen) {
  Outbox outbox = open();
  outbox.add("account", "app");
  const std::int64_t id = outbox.pending().front().id;
  outbox.postpone(id, now.date + 1min, true, "The server is busy.");
  const Invalidation entry = outbox.pending().front();
  EXPECT_EQ(entry.attempts, 1);
  EXPECT_EQ(entry.lastAttemptAt, now.date);
  EXPECT_EQ(entry.nextAttemptAt, now.date + 1min);
  EXPECT_TRUE(entry.isHeldByServer);
  EXPECT_EQ(entry.lastError, "The server is busy.");
}

TEST_F(AnOutbox, SettlesAnEntryOnce) {
  Outbox outbox = open();
  outbox.add("account", "app");
  const std::int64_t id = outbox.pending().front().id;
  outbox.confirm(id);
  outbox.refuse(id, "too late");
  outbox.postpone(id, now.date + 1min, false, "too late");
  EXPECT_THAT(outbox.pending(), IsEmpty());
  const Invalidation entry = outbox.latest(1).front();
  EXPECT_EQ(entry.state, InvalidationState::confirmed);
  EXPECT_EQ(entry.settledAt, now.date);
  EXPECT_EQ(entry.lastError, std::nullopt);
  EXPECT_EQ(entry.attempts, 1);
}

TEST_F(AnOutbox, ListsTheLatestFirst) {
  Outbox outbox = open();
  for (const char* appID : {"1", "2", "3"}) outbox.add("account", appID);
  outbox.refuse(outbox.pending()[1].id, "The server refused.");
  EXPECT_THAT(outbox.latest(2),
              ElementsAre(Field(&Invalidation::appID, "3"),
                          AllOf(Field(&Invalidation::appID, "2"), Field(&Invalidation::state, InvalidationState::refused))));
}

TEST_F(AnOutbox, ForgetsOldEntriesThatAreSettledAndNoOthers) {
  Outbox outbox = open();
  outbox.add("account", "settled");
  outbox.add("account", "pending");
  outbox.confirm(outbox.pending().front().id);
  outbox.removeSettledBefore(now.date);
  EXPECT_THAT(outbox.latest(10), SizeIs(2));
  outbox.removeSettledBefore(now.date + 1s);
  EXPECT_THAT(outbox.latest(10), ElementsAre(Field(&Invalidation::appID, "pending")));
}

TEST_F(AnOutbox, RingsItsBellWhenSomethingIsAdded) {
  Outbox outbox = open();
  FileWatch bell(Outbox::bellOf(_folder.path() / "outbox.sqlite"));
  EXPECT_FALSE(bell.hasChanged());
  outbox.add("account", "app");
  EXPECT_TRUE(bell.hasChanged());
  EXPECT_FALSE(bell.hasChanged());
  outbox.confirm(outbox.pending().front().id);
  EXPECT_FALSE(bell.hasChanged());
}

TEST_F(AnOutbox, TakesEntriesFromManyThreads) {
  Outbox outbox = open();
  std::vector<std::thread> threads;
  for (int thread = 0; thread < 4; ++thread) {
    threads.emplace_back([&outbox] {
      for (int count = 0; count < 10; ++count) outbox.add("account", "app");
    });
  }
  for (std::thread& thread : threads) thread.join();
  EXPECT_THAT(outbox.pending(), SizeIs(40));
}

TEST_F(AnOutbox, IsForItsOwnerAlone) {
  open().add("account", "app");
  for (const auto& entry : std::filesystem::directory_iterator(_folder.path())) {
    EXPECT_EQ(entry.status().permissions() & std::filesystem::perms(077), std::filesystem::perms::none) << entry.path();
  }
}

TEST(Elapsed, IsKnownWithinOneStartOfTheMachineOnly) {
  const Moment before = {.date = {}, .boot = "a", .uptime = 1000ms};
  EXPECT_EQ(elapsed(before, {.date = {}, .boot = "a", .uptime = 1500ms}), 499ms) << "both may have been cut off";
  EXPECT_EQ(elapsed(before, before), 0ms);
  EXPECT_EQ(elapsed(before, {.date = {}, .boot = "b", .uptime = 1500ms}), std::nullopt);
  EXPECT_EQ(elapsed(before, {.date = {}, .boot = "a", .uptime = 500ms}), std::nullopt);
  EXPECT_EQ(elapsed({.date = {}}, {.date = {}}), std::nullopt);
}

TEST(TheClock, TellsTheBootAndGoesOn) {
  const Moment first = presentMoment();
  EXPECT_FALSE(first.boot.empty());
  EXPECT_GE(elapsed(first, presentMoment()), 0ms);
}

TEST_F(AnOutbox, SaysThatARemovedAccountIsSettledWhenNothingOfItIsPending) {
  Outbox outbox = open();
  outbox.add("removed", "app");
  outbox.add("other", "app");
  outbox.noteDeparture("removed");
  outbox.noteDeparture("removed");
  EXPECT_THAT(outbox.departures(), ElementsAre("removed"));
  EXPECT_THAT(outbox.settledDepartures(), IsEmpty());
  outbox.confirm(outbox.pending().front().id);
  EXPECT_THAT(outbox.settledDepartures(), ElementsAre("removed"));
  outbox.forgetDeparture("removed");
  EXPECT_THAT(open().departures(), IsEmpty());
}

}  // namespace
