#include "Host/Preferences/TomlFile.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <atomic>
#include <fstream>
#include <iterator>
#include <optional>
#include <string>
#include <thread>
#include <vector>

#include "Tests/Host/TemporaryFolder.h"

namespace palisade {
namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::ThrowsMessage;

class TomlFile : public testing::Test {
 protected:
  void write(const std::string& text) const { std::ofstream(path) << text; }
  std::vector<std::filesystem::path> filesInFolder() const {
    return {std::filesystem::directory_iterator(folder.path()), std::filesystem::directory_iterator()};
  }

  const TemporaryFolder folder;
  const std::filesystem::path path = folder.path() / "settings.toml";
};

TEST_F(TomlFile, ThatIsNotThereIsNone) {
  EXPECT_EQ(readTomlFile(path), std::nullopt);
  EXPECT_EQ(readTomlFile(folder.path() / "none" / "settings.toml"), std::nullopt);
}

TEST_F(TomlFile, ThatIsEmptyHoldsNothing) {
  write("# Nothing yet.\n");
  EXPECT_EQ(readTomlFile(path), Dictionary());
}

TEST_F(TomlFile, KeepsTheTypesOfItsValues) {
  write(R"(text = "5"
whole = 5
real = 5.0
truth = true
day = 2012-02-29
time = 07:30:00
moment = 2012-02-29T07:30:00Z
list = ["a", 1, [false]]
[table]
"quoted key" = ""
)");
  EXPECT_EQ(readTomlFile(path), (Dictionary{{"text", "5"},
                                            {"whole", 5},
                                            {"real", 5.0},
                                            {"truth", true},
                                            {"day", "2012-02-29"},
                                            {"time", "07:30:00"},
                                            {"moment", "2012-02-29T07:30:00Z"},
                                            {"list", Array{"a", 1, Array{false}}},
                                            {"table", Dictionary{{"quoted key", ""}}}}));
}

TEST_F(TomlFile, ThatIsWrongIsNamedWithItsLine) {
  for (const std::string wrong :
       {"good = 1\nbad = yes\n", "good = 1\ngood = 2\n", "good = 1\nbad = \"open\n", "good = 1\n= 2\n"}) {
    write(wrong);
    EXPECT_THAT([&] { readTomlFile(path); }, ThrowsMessage<TomlError>(AllOf(HasSubstr(path.string()), HasSubstr("line 2"))))
        << wrong;
  }
}

TEST_F(TomlFile, ThatCannotBeReadIsNamed) {
  std::filesystem::create_directory(path);
  EXPECT_THAT([&] { readTomlFile(path); }, ThrowsMessage<TomlError>(HasSubstr(path.string())));
}

TEST_F(TomlFile, ReadsWhatWasWritten) {
  const Dictionary table{{"text", "a \"quoted\" line\nand another"},
                         {"number", -7},
                         {"real", 0.25},
                         {"truth", false},
                         {"list", Array{"a", 1, Array{}, Dictionary{{"in", "it"}}}},
                         {"table", Dictionary{{"key with = and #", 1}}}};
  writeTomlFile(path, table);
  EXPECT_EQ(readTomlFile(path), table);
}

TEST_F(TomlFile, LeavesNullsOut) {
  writeTomlFile(path, {{"nobody", nullptr}, {"list", Array{1, nullptr}}});
  EXPECT_EQ(readTomlFile(path), (Dictionary{{"list", Array{1}}}));
}

TEST_F(TomlFile, IsForItsOwnerAloneAndTheOnlyOneLeft) {
  writeTomlFile(path, {{"a", 1}});
  writeTomlFile(path, {{"a", 2}});
  EXPECT_EQ(filesInFolder(), std::vector{path});
  struct stat status {};
  ASSERT_EQ(stat(path.c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 0777U, 0600U);
}

TEST_F(TomlFile, KeepsItsContentWhenItCannotBeReplaced) {
  // A folder of that name cannot be replaced by a file.
  std::filesystem::create_directories(path / "kept");
  EXPECT_THAT(
      [&] {
        writeTomlFile(path, {{"a", 1}});
      },
      ThrowsMessage<TomlError>(AllOf(HasSubstr(path.string()), HasSubstr("cannot be written"))));
  EXPECT_EQ(filesInFolder(), std::vector{path});
  EXPECT_TRUE(std::filesystem::exists(path / "kept"));
  EXPECT_THROW(writeTomlFile(folder.path() / "none" / "settings.toml", {}), TomlError);
}

TEST_F(TomlFile, IsSeenWholeByWhoeverReadsWhileItIsReplaced) {
  const auto version = [](int number) {
    return Dictionary{{"first", number}, {"filling", std::string(20'000, 'x')}, {"last", number}};
  };
  writeTomlFile(path, version(0));
  std::atomic<bool> isDone = false;
  std::jthread writer([&] {
    for (int number = 1; number <= 50; ++number) writeTomlFile(path, version(number));
    isDone = true;
  });
  while (!isDone) {
    const std::optional<Dictionary> seen = readTomlFile(path);
    ASSERT_TRUE(seen);
    ASSERT_NE(seen->find("last"), nullptr);
    ASSERT_EQ(*seen->find("first"), *seen->find("last"));
  }
}

}  // namespace
}  // namespace palisade
