#include "Host/Sqlite/Database.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <array>
#include <fstream>

#include "Host/Sqlite/Statement.h"
#include "Host/Sqlite/Transaction.h"
#include "Tests/Host/Store/StoreFiles.h"
#include "Tests/Host/Store/Unprivileged.h"
#include "Tests/Host/TemporaryFolder.h"

namespace palisade {
namespace {

using testing::AllOf;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::MatchesRegex;

constexpr std::array<std::string_view, 1> firstVersion{"CREATE TABLE words (word TEXT NOT NULL UNIQUE) STRICT;"};
constexpr std::array<std::string_view, 3> thirdVersion{firstVersion[0],
                                                       "ALTER TABLE words ADD COLUMN length INTEGER NOT NULL DEFAULT 0;",
                                                       "UPDATE words SET length = length(word);"};
constexpr std::array<std::string_view, 2> brokenSecondVersion{
    firstVersion[0], "INSERT INTO words VALUES ('from the broken step'); SELECT nonsense;"};

class AStore : public testing::Test {
 protected:
  StoreOptions options(std::span<const std::string_view> migrations = firstVersion) const {
    return {.path = path, .applicationID = 42, .migrations = migrations, .busyTimeout = std::chrono::milliseconds{50}};
  }

  StoreOptions fresh() const {
    StoreOptions result = options();
    result.onDamage = DamagedStore::startFresh;
    return result;
  }

  // What opening the store fails with.
  SqliteError failureOf(const StoreOptions& whatToOpen) const {
    try {
      Database::open(whatToOpen);
    } catch (const SqliteError& error) {
      return error;
    }
    return {StoreErrorOther, {}, "", "it opened"};
  }

  static void addWord(Database& database, std::string_view word) {
    Statement(database, "add a word", "INSERT INTO words (word) VALUES (?1)").execute(word);
  }

  static std::vector<std::string> wordsIn(Database& database) {
    Statement list(database, "list the words", "SELECT word FROM words ORDER BY word");
    std::vector<std::string> words;
    Statement::Run row = list.run();
    while (row.next()) words.push_back(row.text(0));
    return words;
  }

  static std::int64_t number(Database& database, std::string_view sql) {
    Statement read(database, "read a number", sql);
    Statement::Run row = read.run();
    row.next();
    return row.integer(0);
  }

  TemporaryFolder folder;
  const std::filesystem::path path = folder.path() / "state" / "words.sqlite";
};

mode_t rightsOf(const std::filesystem::path& path) {
  struct stat status {};
  EXPECT_EQ(stat(path.c_str(), &status), 0) << path;
  return status.st_mode & 07777;
}

TEST_F(AStore, IsForItsOwnerAloneWithItsLogAndItsFolder) {
  const auto database = Database::open(options());
  addWord(*database, "secret");
  EXPECT_EQ(rightsOf(path.parent_path()), 0700U);
  for (const char* suffix : {"", "-wal", "-shm"}) EXPECT_EQ(rightsOf(path.string() + suffix), 0600U) << suffix;
}

TEST_F(AStore, LeavesNoUnfinishedFileBehind) {
  Database::open(options());
  EXPECT_THAT(namesIn(path.parent_path()), ElementsAre("words.sqlite"));
}

TEST_F(AStore, TakesRightsAwayThatOthersWereGiven) {
  Database::open(options());
  ASSERT_EQ(chmod(path.c_str(), 0664), 0);
  Database::open(options());
  EXPECT_EQ(rightsOf(path), 0600U);
}

TEST_F(AStore, SyncsEveryChangeAndWipesWhatIsDeleted) {
  const auto database = Database::open(options());
  EXPECT_EQ(number(*database, "PRAGMA synchronous"), 2) << "2 is FULL";
  EXPECT_EQ(number(*database, "PRAGMA secure_delete"), 1);
  EXPECT_EQ(number(*database, "PRAGMA foreign_keys"), 1);
  Statement mode(*database, "read the mode", "PRAGMA journal_mode");
  Statement::Run row = mode.run();
  ASSERT_TRUE(row.next());
  EXPECT_EQ(row.text(0), "wal");
}

TEST_F(AStore, KeepsWhatWasStored) {
  addWord(*Database::open(options()), "kept");
  EXPECT_THAT(wordsIn(*Database::open(options())), ElementsAre("kept"));
}

TEST_F(AStore, IsBroughtUpToDateStepByStep) {
  addWord(*Database::open(options()), "four");
  const auto database = Database::open(options(thirdVersion));
  EXPECT_EQ(number(*database, "SELECT length FROM words"), 4);
  EXPECT_EQ(number(*database, "PRAGMA user_version"), 3);
}

TEST_F(AStore, StaysAsItWasWhenAStepFails) {
  addWord(*Database::open(options()), "old");
  EXPECT_THAT(failureOf(options(brokenSecondVersion)).what(), AllOf(HasSubstr("words.sqlite"), HasSubstr("up to date")));
  const auto database = Database::open(options());
  EXPECT_THAT(wordsIn(*database), ElementsAre("old"));
}

TEST_F(AStore, OfANewerVersionIsLeftAlone) {
  Database::open(options(thirdVersion));
  const SqliteError failure = failureOf(options());
  EXPECT_EQ(failure.code(), StoreErrorNewerVersion);
  EXPECT_THAT(failure.what(), AllOf(HasSubstr("version 3"), HasSubstr("1 to 1"), HasSubstr("newer program")));
  EXPECT_THAT(namesIn(path.parent_path()), ElementsAre("words.sqlite"));
}

TEST_F(AStore, OfAnotherKindIsLeftAlone) {
  Database::open(options());
  StoreOptions other = options();
  other.applicationID = 43;
  EXPECT_EQ(failureOf(other).code(), StoreErrorForeign);
  EXPECT_THAT(namesIn(path.parent_path()), ElementsAre("words.sqlite"));
}

struct Damage {
  const char* name;
  void (*inflict)(const std::filesystem::path& store);
};

void PrintTo(const Damage& damage, std::ostream* stream) { *stream << damage.name; }

class ADamagedStore : public AStore, public testing::WithParamInterface<Damage> {
 protected:
  void SetUp() override {
    Database::open(options());
    GetParam().inflict(path);
  }
};

TEST_P(ADamagedStore, IsSetAsideAndReportedAndNotReplacedInSilence) {
  const std::string content = contentOf(path);
  const SqliteError failure = failureOf(options());
  EXPECT_EQ(failure.code(), StoreErrorDamaged);
  EXPECT_THAT(failure.what(), AllOf(HasSubstr(path.string()), HasSubstr("set aside as words.sqlite.corrupt-"),
                                    HasSubstr("ask for a fresh store")));

  const auto names = namesIn(path.parent_path());
  ASSERT_THAT(names, ElementsAre(MatchesRegex("words\\.sqlite\\.corrupt-[0-9]{8}T[0-9]{6}")));
  EXPECT_EQ(contentOf(path.parent_path() / names[0]), content);

  EXPECT_EQ(failureOf(options()).code(), StoreErrorSetAside) << "the next start is told as well";
  EXPECT_EQ(namesIn(path.parent_path()), names) << "and makes no new store either";
}

TEST_P(ADamagedStore, IsReplacedByAFreshOneOnRequest) {
  const auto database = Database::open(fresh());
  EXPECT_THAT(wordsIn(*database), IsEmpty());
  ASSERT_TRUE(database->setAside());
  EXPECT_TRUE(std::filesystem::exists(*database->setAside()));
  EXPECT_FALSE(Database::open(options())->setAside()) << "the fresh store is an ordinary store from then on";
}

TEST_P(ADamagedStore, MayBeReplacedByAFreshOneLater) {
  failureOf(options());
  EXPECT_THAT(wordsIn(*Database::open(fresh())), IsEmpty());
}

TEST_P(ADamagedStore, OpensAgainWhenAGoodCopyIsPutBack) {
  failureOf(options());
  StoreOptions copy = options();
  copy.path = folder.path() / "copy" / "words.sqlite";
  addWord(*Database::open(copy), "saved");
  std::filesystem::copy_file(copy.path, path);
  EXPECT_THAT(wordsIn(*Database::open(options())), ElementsAre("saved"));
}

INSTANTIATE_TEST_SUITE_P(
    Damages, ADamagedStore,
    testing::Values(Damage{"emptied", [](const auto& store) { std::filesystem::resize_file(store, 0); }},
                    Damage{"cutOff", [](const auto& store) { std::filesystem::resize_file(store, 5000); }},
                    Damage{"overwrittenFromTheStart", [](const auto& store) { overwrite(store, 0, std::string(200, 'x')); }},
                    Damage{"overwrittenInThePages", [](const auto& store) { overwrite(store, 4096, std::string(4096, 'x')); }},
                    Damage{"withoutVersion", [](const auto& store) { overwrite(store, 60, std::string(4, '\0')); }}),
    [](const auto& each) { return each.param.name; });

TEST_F(AStore, WhoseLogIsLeftAloneIsNotReplacedInSilence) {
  {
    const auto database = Database::open(options());
    addWord(*database, "only in the log");
    std::filesystem::copy_file(path.string() + "-wal", folder.path() / "log");
  }
  std::filesystem::remove(path);
  std::filesystem::rename(folder.path() / "log", path.string() + "-wal");
  EXPECT_EQ(failureOf(options()).code(), StoreErrorSetAside);
  EXPECT_THAT(namesIn(path.parent_path()), ElementsAre(MatchesRegex("words\\.sqlite\\.corrupt-[0-9]{8}T[0-9]{6}-wal")));
}

TEST_F(AStore, IsNotKeptWhereOthersCanWrite) {
  std::filesystem::create_directory(path.parent_path());
  ASSERT_EQ(chmod(path.parent_path().c_str(), 0770), 0);
  const SqliteError failure = failureOf(options());
  EXPECT_EQ(failure.code(), StoreErrorNotWritable);
  EXPECT_THAT(failure.what(), HasSubstr("chmod go-w"));
}

TEST_F(AStore, ThatIsALinkIsRefused) {
  Database::open(options());
  std::filesystem::rename(path, folder.path() / "elsewhere");
  std::filesystem::create_symlink(folder.path() / "elsewhere", path);
  EXPECT_EQ(failureOf(options()).code(), StoreErrorNotWritable);
}

TEST_F(AStore, InAReadOnlyFolderIsReported) {
  const Unprivileged user(folder.path());
  Database::open(options());
  ASSERT_EQ(chmod(path.parent_path().c_str(), 0500), 0);
  const SqliteError failure = failureOf(options());
  EXPECT_EQ(failure.code(), StoreErrorNotWritable);
  EXPECT_THAT(failure.what(), AllOf(HasSubstr(path.string()), HasSubstr("writable for this user")));
}

TEST_F(AStore, ThatIsReadOnlyIsReported) {
  const Unprivileged user(folder.path());
  Database::open(options());
  ASSERT_EQ(chmod(path.c_str(), 0400), 0);
  EXPECT_EQ(failureOf(options()).code(), StoreErrorNotWritable);
}

TEST_F(AStore, CannotBeMadeInAReadOnlyFolder) {
  const Unprivileged user(folder.path());
  ASSERT_EQ(chmod(folder.path().c_str(), 0500), 0);
  EXPECT_EQ(failureOf(options()).code(), StoreErrorNotWritable);
}

TEST_F(AStore, HeldByAnotherConnectionForTooLongIsBusy) {
  const auto holder = Database::open(options());
  const auto other = Database::open(options());
  const Transaction transaction(*holder);
  try {
    addWord(*other, "late");
    ADD_FAILURE() << "two writers at once";
  } catch (const SqliteError& error) {
    EXPECT_EQ(error.code(), StoreErrorBusy);
    EXPECT_THAT(error.what(), AllOf(HasSubstr("cannot add a word"), HasSubstr("another process")));
  }
}

TEST_F(AStore, ReadsBesideAWriterWhatWasStoredBefore) {
  const auto writer = Database::open(options());
  const auto reader = writer->openReader();
  addWord(*writer, "stored");
  Transaction transaction(*writer);
  addWord(*writer, "not yet");
  EXPECT_THAT(wordsIn(*reader), ElementsAre("stored"));
  transaction.commit();
  EXPECT_THAT(wordsIn(*reader), ElementsAre("not yet", "stored"));
}

TEST_F(AStore, DropsATransactionThatIsNotCommitted) {
  const auto database = Database::open(options());
  {
    const Transaction transaction(*database);
    addWord(*database, "dropped");
  }
  EXPECT_THAT(wordsIn(*database), IsEmpty());
}

TEST_F(AStore, TellsAContradictionFromAFailure) {
  const auto database = Database::open(options());
  addWord(*database, "twice");
  try {
    addWord(*database, "twice");
    ADD_FAILURE() << "a unique word was stored twice";
  } catch (const SqliteError& error) {
    EXPECT_EQ(error.code(), StoreErrorConstraint);
  }
}

TEST_F(AStore, RefusesAValueOfAnotherTypeThanWasAskedFor) {
  const auto database = Database::open(options());
  addWord(*database, "text");
  Statement read(*database, "read a word", "SELECT word FROM words");
  Statement::Run row = read.run();
  ASSERT_TRUE(row.next());
  EXPECT_THROW(row.integer(0), SqliteError);
}

TEST_F(AStore, KeepsTextsWithEveryByteAndEmptyOnes) {
  const auto database = Database::open(options());
  const std::string odd("a\0b'\"\xc3\xa4", 7);
  addWord(*database, odd);
  addWord(*database, "");
  EXPECT_THAT(wordsIn(*database), ElementsAre("", odd));
}

}  // namespace
}  // namespace palisade
