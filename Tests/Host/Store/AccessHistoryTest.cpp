#include "Host/Accounts/AccessHistory.h"

#include <gmock/gmock.h>

#include <atomic>
#include <thread>

#include "Host/Accounts/AccountStoreSchema.h"
#include "Tests/Host/Store/AccountStoreFixture.h"

namespace palisade {
namespace {

using testing::ElementsAre;
using testing::SizeIs;

class TheAccessHistory : InMemory, public AccountStoreFixture {
 protected:
  static AccessRequestRecord requestOf(const std::string& client) {
    return {.accountTypeIdentifier = "type", .bundleID = client, .granted = true, .userPrompted = false, .elapsedSeconds = 0.5};
  }

  static std::vector<std::string> clientsOf(const std::vector<HistoryEntry>& entries) {
    std::vector<std::string> clients;
    for (const HistoryEntry& entry : entries) clients.push_back(entry.bundleID.value_or(""));
    return clients;
  }

  std::atomic<int> failures = 0;
  std::unique_ptr<AccessHistory> history = std::make_unique<AccessHistory>(*store, [this](const Error&) { ++failures; });
};

TEST_F(TheAccessHistory, ShowsWhatWasAppendedBeforeNewestFirst) {
  for (const char* client : {"a", "b", "c"}) history->append(requestOf(client), Date());
  EXPECT_THAT(clientsOf(history->entries({})), ElementsAre("c", "b", "a"));
  EXPECT_EQ(failures, 0);
}

TEST_F(TheAccessHistory, KeepsEveryFieldOfARequest) {
  history->append({.accountTypeIdentifier = "type", .bundleID = std::nullopt, .userPrompted = true, .elapsedSeconds = 1.25},
                  Date(std::chrono::seconds(7)));
  const auto entries = history->entries({});
  ASSERT_THAT(entries, SizeIs(1));
  EXPECT_EQ(entries[0].last, Date(std::chrono::seconds(7)));
  EXPECT_EQ(entries[0].accountTypeIdentifier, "type");
  EXPECT_EQ(entries[0].bundleID, std::nullopt);
  EXPECT_FALSE(entries[0].granted);
  EXPECT_TRUE(entries[0].userPrompted);
  EXPECT_EQ(entries[0].elapsedSeconds, 1.25);
}

TEST_F(TheAccessHistory, HasStoredWhatTheUserWasAskedAboutWhenItIsFlushed) {
  AccessRequestRecord asked = requestOf("asked");
  asked.userPrompted = true;
  history->append(requestOf("before"), Date());
  history->append(asked, Date());
  history->flush();
  EXPECT_THAT(clientsOf(store->history({})), ElementsAre("asked", "before"));
}

TEST_F(TheAccessHistory, StoresWhatIsLeftWhenItEnds) {
  for (int request = 0; request < 100; ++request) history->append(requestOf("client"), Date());
  history.reset();
  EXPECT_EQ(store->history({})[0].count, 100);
}

TEST_F(TheAccessHistory, TakesEntriesFromManyThreadsAndLosesNone) {
  constexpr int threads = 4;
  constexpr int requests = 2'500;
  {
    std::vector<std::jthread> clients;
    for (int thread = 0; thread < threads; ++thread) {
      clients.emplace_back([&, thread] {
        for (int request = 0; request < requests; ++request) history->append(requestOf(std::to_string(thread)), Date());
        EXPECT_EQ(history->entries({.bundleID = std::to_string(thread)})[0].count, requests);
      });
    }
  }
  EXPECT_THAT(history->entries({}), SizeIs(threads));
}

TEST_F(TheAccessHistory, TellsThatEntriesAreLostAndGoesOn) {
  const auto database =
      Database::open({.path = path, .applicationID = accountStoreApplicationID, .migrations = accountStoreMigrations});
  database->execute("hide the history", "ALTER TABLE history RENAME TO hidden");
  history->append(requestOf("lost"), Date());
  EXPECT_ANY_THROW(history->entries({}));
  EXPECT_EQ(failures, 1);
  database->execute("show the history", "ALTER TABLE hidden RENAME TO history");
  history->append(requestOf("a"), Date());
  EXPECT_THAT(clientsOf(history->entries({})), ElementsAre("a"));
  EXPECT_EQ(failures, 1);
}

}  // namespace
}  // namespace palisade
