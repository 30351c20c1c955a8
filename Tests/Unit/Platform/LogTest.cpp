// The log facility keeps a record's pieces apart and asks nothing of a record that nobody reads.

#include "Platform/Log.h"

#include <gmock/gmock.h>

#include "Platform/Client.h"
#include "Platform/Format.h"

namespace palisade {
namespace {

using ::testing::ElementsAre;
using ::testing::EndsWith;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::SizeIs;

struct WrittenRecord {
  std::string operationName;
  std::string file;
  unsigned line;
  std::string function;
  LogLevel level;
  std::string format;
  std::string argumentNames;
  std::vector<std::string> arguments;
};

// Keeps what is enabled; renders on demand only, as the daemon's log does.
class KeepingLog final : public Log {
 public:
  explicit KeepingLog(LogLevel highestLevel) : _highestLevel(highestLevel) {}

  bool isEnabled(LogLevel level) const override { return level <= _highestLevel; }

  void write(const LogRecord& record) override {
    WrittenRecord& written = records.emplace_back(WrittenRecord{
        .operationName = std::string(record.place.operationName),
        .file = record.place.where.file_name(),
        .line = record.place.where.line(),
        .function = record.place.where.function_name(),
        .level = record.level,
        .format = std::string(record.format),
        .argumentNames = std::string(record.argumentNames),
        .arguments = {},
    });
    if (!renders) return;
    for (const LogArgument& argument : record.arguments) written.arguments.push_back(describe(argument));
  }

  void logAccessRequest(const AccessRequestRecord&) override {}

  std::vector<WrittenRecord> records;
  bool renders = true;

 private:
  LogLevel _highestLevel;
};

struct CountingClient final : Client {
  std::optional<std::string> bundleID() const override { return std::nullopt; }
  std::string localizedAppName() const override { return ""; }
  bool hasEntitlement(std::string_view) const override { return false; }
  std::string description() const override {
    ++descriptions;
    return "the client";
  }
  mutable int descriptions = 0;
};

TEST(ARecord, CarriesItsPlaceItsLevelItsFormatAndItsArgumentsApart) {
  KeepingLog log(LogLevel::debug);
  const std::shared_ptr<const Client> client = std::make_shared<CountingClient>();

  log.record("operation:with:", LogLevel::notice, "%@ asked %d times.", "client, count", client, std::size_t{2});
  const unsigned line = __LINE__ - 1;

  ASSERT_THAT(log.records, SizeIs(1));
  const WrittenRecord& record = log.records.front();
  EXPECT_EQ(record.operationName, "operation:with:");
  EXPECT_THAT(record.file, EndsWith("LogTest.cpp"));
  EXPECT_EQ(record.line, line);
  EXPECT_THAT(record.function, HasSubstr("TestBody"));
  EXPECT_EQ(record.level, LogLevel::notice);
  EXPECT_EQ(record.format, "%@ asked %d times.");
  EXPECT_EQ(record.argumentNames, "client, count");
  EXPECT_THAT(record.arguments, ElementsAre("the client", "2"));
}

TEST(ARecordWithoutArguments, IsWrittenLikeAnyOther) {
  KeepingLog log(LogLevel::debug);

  log.record("operation", LogLevel::error, "No arguments.", "");

  ASSERT_THAT(log.records, SizeIs(1));
  EXPECT_EQ(log.records.front().format, "No arguments.");
  EXPECT_THAT(log.records.front().argumentNames, IsEmpty());
  EXPECT_THAT(log.records.front().arguments, IsEmpty());
}

TEST(ALevelThatIsNotEnabled, MakesNoRecordAndRendersNothing) {
  KeepingLog log(LogLevel::notice);
  const auto client = std::make_shared<CountingClient>();

  log.record("operation", LogLevel::debug, "%@", "client", std::shared_ptr<const Client>(client));

  EXPECT_THAT(log.records, IsEmpty());
  EXPECT_EQ(client->descriptions, 0);
}

TEST(ARecord, IsRenderedByTheLogAlone) {
  KeepingLog log(LogLevel::debug);
  log.renders = false;
  const auto client = std::make_shared<CountingClient>();

  log.record("operation", LogLevel::debug, "%@", "client", std::shared_ptr<const Client>(client));

  EXPECT_THAT(log.records, SizeIs(1));
  EXPECT_EQ(client->descriptions, 0);
}

TEST(EachLevel, HasItsNumberOfSyslog) {
  EXPECT_EQ(static_cast<int>(LogLevel::error), 3);
  EXPECT_EQ(static_cast<int>(LogLevel::notice), 5);
  EXPECT_EQ(static_cast<int>(LogLevel::debug), 7);
}

}  // namespace
}  // namespace palisade
