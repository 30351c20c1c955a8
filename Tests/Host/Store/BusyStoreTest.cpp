// Many threads, many records, and a disk that is really full.

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sched.h>
#include <sys/mount.h>

#include <atomic>
#include <cerrno>
#include <cstring>
#include <fstream>
#include <thread>

#include "Host/Accounts/AccountStoreSchema.h"
#include "Host/Sqlite/Transaction.h"
#include "Tests/Host/OwnRoot.h"
#include "Tests/Host/Store/AccountStoreFixture.h"

namespace palisade {
namespace {

using testing::Optional;
using testing::SizeIs;

std::vector<HistoryEntry> oneEntry(const std::string& accountType) {
  return {{.accountTypeIdentifier = accountType, .bundleID = "bundle"}};
}

class ABusyStore : InMemory, public AccountStoreFixture {
 protected:
  // Runs SQL on the closed store, in one change.
  void fill(const std::string& sql) {
    store.reset();
    const auto database =
        Database::open({.path = path, .applicationID = accountStoreApplicationID, .migrations = accountStoreMigrations});
    Transaction transaction(*database);
    database->execute("fill the store", sql.c_str());
    transaction.commit();
  }
};

TEST_F(ABusyStore, GivesEveryThreadWholeRecordsAndKeepsTheLast) {
  constexpr int writers = 4;
  constexpr int rounds = 50;
  store.reset();
  store = std::make_unique<SqliteAccountStore>(AccountStoreOptions{.path = path}, directory);

  std::atomic<bool> isOver = false;
  std::atomic<int> reads = 0;
  {
    std::vector<std::jthread> readers;
    for (int reader = 0; reader < 6; ++reader) {
      readers.emplace_back([&, reader] {
        while (!isOver) {
          const auto record = get("client " + std::to_string(reader % writers));
          if (record) {
            EXPECT_EQ(*record, grantNumber(static_cast<int>(*record->options->find("number")->integer())));
          }
          for (const StoredAuthorization& each : store->storedAuthorizations(facebookType.identifier())) {
            EXPECT_FALSE(each.isDamaged);
          }
          store->history({.limit = 3});
          ++reads;
        }
      });
    }
    std::vector<std::jthread> writing;
    for (int writer = 0; writer < writers; ++writer) {
      writing.emplace_back([&, writer] {
        for (int round = 0; round <= rounds; ++round) {
          EXPECT_EQ(set("client " + std::to_string(writer), grantNumber(round)), std::nullopt);
          EXPECT_EQ(get("client " + std::to_string(writer)), grantNumber(round)) << "a thread reads what it wrote";
          store->appendToHistory(oneEntry("type"));
        }
      });
    }
    writing.clear();
    isOver = true;
  }
  EXPECT_GT(reads, 0);
  for (int writer = 0; writer < writers; ++writer) {
    EXPECT_THAT(get("client " + std::to_string(writer)), Optional(grantNumber(rounds)));
  }
  EXPECT_EQ(store->history({})[0].count, writers * (rounds + 1));
}

TEST_F(ABusyStore, FindsOneRecordAmongMany) {
  set("client", grantNumber(1));
  fill(R"sql(
    WITH RECURSIVE numbers (number) AS (SELECT 1 UNION ALL SELECT number + 1 FROM numbers WHERE number < 100000)
    INSERT INTO authorizations (account_type, client_id, app_name, granted, answered_by_nobody, updated_at, digest)
    SELECT 'com.veltran.accounttype.facebook', 'other ' || number, 'Other', 1, 0, 0, 0 FROM numbers)sql");
  restart();
  EXPECT_THAT(get("client"), Optional(grantNumber(1)));
}

// A disk of a megabyte, which this process alone sees.
bool mountSmallDisk(const std::filesystem::path& place) {
  return unshare(CLONE_NEWNS) == 0 && mount("none", "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0 &&
         mount("none", place.c_str(), "tmpfs", 0, "size=1m,mode=0700") == 0;
}

TEST_F(ABusyStore, OnAFullDiskSaysSoAndGoesOnWhenThereIsSpace) {
  if (ranWithItsOwnRoot()) return;
  store.reset();
  ASSERT_TRUE(mountSmallDisk(path.parent_path())) << std::strerror(errno);
  restart();
  ASSERT_EQ(set("one", grantNumber(1)), std::nullopt);

  std::ofstream filler(path.parent_path() / "filler");
  while (filler << std::string(4096, 'x') << std::flush) {
  }
  filler.close();
  int written = 1;
  std::optional<Error> error;
  while (!error && written < 1000) error = set("one", grantNumber(++written));
  ASSERT_TRUE(error) << "the disk is not full";
  EXPECT_EQ(error->code, StoreErrorFull) << error->description.value_or("");
  EXPECT_THAT(get("one"), Optional(grantNumber(written - 1)));

  std::filesystem::remove(path.parent_path() / "filler");
  EXPECT_EQ(set("one", grantNumber(0)), std::nullopt);
  restart();
  EXPECT_THAT(get("one"), Optional(grantNumber(0)));
}

}  // namespace
}  // namespace palisade
