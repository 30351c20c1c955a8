// Bytes of the file change behind the store's back. It may notice when it is opened, when a record is read, or never, when the
// record is lost altogether; what it may not do is hand out a record that nobody stored.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fstream>

#include "Host/Accounts/AccountStoreSchema.h"
#include "Host/Sqlite/Statement.h"
#include "Tests/Host/Store/AccountStoreFixture.h"
#include "Tests/Host/Store/StoreFiles.h"

namespace palisade {
namespace {

using testing::AnyOf;
using testing::Eq;
using testing::HasSubstr;
using testing::Optional;
using testing::SizeIs;

class ADamagedFile : InMemory, public AccountStoreFixture {
 protected:
  ADamagedFile() {
    for (int number = 0; number < recordCount; ++number) set(client(number), stored(number));
    store.reset();
    content = contentOf(path);
  }

  static constexpr int recordCount = 16;
  static std::string client(int number) { return "org.example.client" + std::to_string(number); }
  static RecordContent stored(int number) { return number % 2 == 0 ? grantNumber(number) : refusal; }

  // Puts the damaged content into a store and reads everything through it. Answers whether the damage was noticed.
  bool isNoticed(const std::string& damaged) {
    store.reset();
    std::filesystem::remove_all(path.parent_path());
    std::filesystem::create_directory(path.parent_path());
    std::ofstream(path, std::ios::binary) << damaged;
    try {
      restart();
    } catch (const SqliteError&) {
      return true;
    }
    bool noticed = false;
    for (int number = 0; number < recordCount; ++number) {
      try {
        EXPECT_THAT(get(client(number)), AnyOf(Eq(std::nullopt), Optional(stored(number)))) << client(number);
      } catch (const SqliteError&) {
        noticed = true;
      }
    }
    try {
      for (const StoredAuthorization& each : store->storedAuthorizations(facebookType.identifier())) {
        noticed = noticed || each.isDamaged;
        if (each.isDamaged) {
          EXPECT_FALSE(each.record->isGranted()) << each.clientID;
        } else {
          EXPECT_THAT(contentOf(each.record), Optional(stored(numberOf(each.clientID)))) << each.clientID;
        }
      }
    } catch (const SqliteError&) {
      noticed = true;
    }
    return noticed;
  }

  static int numberOf(const std::string& clientID) { return std::stoi(clientID.substr(client(0).size() - 1)); }

  std::string content;
};

TEST_F(ADamagedFile, WithABitFlippedAnywhereNeverChangesARecord) {
  int noticed = 0;
  int flips = 0;
  for (std::size_t offset = 0; offset < content.size(); offset += 83) {
    std::string damaged = content;
    damaged[offset] = static_cast<char>(damaged[offset] ^ (1 << (offset % 8)));
    SCOPED_TRACE("bit " + std::to_string(offset % 8) + " of byte " + std::to_string(offset));
    noticed += isNoticed(damaged) ? 1 : 0;
    ++flips;
    ASSERT_FALSE(HasFailure());
  }
  EXPECT_GT(flips, 300);
  EXPECT_GT(noticed, flips / 20) << "much of the file is free space";
}

TEST_F(ADamagedFile, OverwrittenAnywhereNeverChangesARecord) {
  for (std::size_t offset = 0; offset + 64 < content.size(); offset += 331) {
    for (const char byte : {'\0', '\xff', '1'}) {
      std::string damaged = content;
      damaged.replace(offset, 64, std::string(64, byte));
      SCOPED_TRACE("64 bytes from " + std::to_string(offset));
      isNoticed(damaged);
      ASSERT_FALSE(HasFailure());
    }
  }
}

// SQLite counts a page that was begun as a whole one, so a cut inside the last page may go unnoticed when it takes free space
// alone; every record then reads as before.
TEST_F(ADamagedFile, CutOffAnywhereIsNoticedOrHarmless) {
  constexpr std::size_t pageSize = 4096;
  for (std::size_t size = 0; size < content.size(); size += 997) {
    SCOPED_TRACE("cut off after " + std::to_string(size));
    const bool noticed = isNoticed(content.substr(0, size));
    EXPECT_TRUE(noticed || size > content.size() - pageSize);
    ASSERT_FALSE(HasFailure());
  }
}

class ADamagedRecord : public AccountStoreFixture {
 protected:
  // Changes the stored records as a flipped bit would: without the store's knowing.
  void changeBehindTheStore(const char* sql) {
    store.reset();
    Database::open({.path = path, .applicationID = accountStoreApplicationID, .migrations = accountStoreMigrations})
        ->execute("damage", sql);
    restart();
  }

  void damage() {
    set("refused", refusal);
    set("granted", grantNumber(1));
    changeBehindTheStore("UPDATE authorizations SET granted = 1 WHERE client_id = 'refused'");
  }
};

TEST_F(ADamagedRecord, IsReportedAndNotReadAsAGrant) {
  damage();
  try {
    get("refused");
    ADD_FAILURE() << "a damaged record was read";
  } catch (const SqliteError& error) {
    EXPECT_EQ(error.code(), StoreErrorDamaged);
    EXPECT_THAT(error.what(), HasSubstr("refused"));
  }
  EXPECT_THAT(get("granted"), Optional(grantNumber(1))) << "the others are as good as before";
}

TEST_F(ADamagedRecord, IsListedAsARefusal) {
  damage();
  const auto stored = store->storedAuthorizations(facebookType.identifier());
  ASSERT_THAT(stored, SizeIs(2));
  EXPECT_TRUE(stored[0].isDamaged);
  EXPECT_FALSE(stored[0].record->isGranted());
  EXPECT_FALSE(stored[1].isDamaged);
}

TEST_F(ADamagedRecord, IsMendedByTheNextWrite) {
  damage();
  set("refused", refusal);
  EXPECT_THAT(get("refused"), Optional(refusal));
}

TEST_F(ADamagedRecord, OfAnotherClientIsNotTakenForOnesOwn) {
  set("a", grantNumber(1));
  changeBehindTheStore("UPDATE authorizations SET client_id = 'b'");
  EXPECT_THROW(get("b"), SqliteError);
}

TEST_F(ADamagedRecord, OfAnotherAccountTypeIsNotTakenForThisOne) {
  set("a", grantNumber(1));
  changeBehindTheStore("UPDATE authorizations SET account_type = 'org.example.accounttype.other'");
  EXPECT_THROW(get("a", otherType), SqliteError);
}

}  // namespace
}  // namespace palisade
