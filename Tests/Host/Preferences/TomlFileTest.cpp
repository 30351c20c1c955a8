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
  std::string content() const {
    std::ifstream file(path);
    return {std::istreambuf_iterator<char>(file), {}};
  }
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

TEST_F(TomlFile, KeepsWhatIsWrittenAroundAValueThatIsSet) {
  const struct {
    const char* what;
    const char* before;
    std::optional<Value> value;
    const char* after;
  } cases[] = {
      {"no file", "", 1, "size = 1\n"},
      {"a comment alone", "# mine", 1, "# mine\nsize = 1\n"},
      {"an old value", "# mine\nsize = 1  # in points\nfont = 'serif'\n", 22,
       "# mine\nsize = 22  # in points\nfont = 'serif'\n"},
      {"a value of several lines", "size = [1,  # one\n  2]\n# mine\n", 1, "size = 1\n# mine\n"},
      {"letters of several bytes", "\"größe\" = 'ä' # ü\nsize = 'ö'#ü\n", 1, "\"größe\" = 'ä' # ü\nsize = 1#ü\n"},
      {"a new value before tables", "a = 1 # mine\n\n# of the window\n[window]\nwidth = 3\n", 1,
       "a = 1 # mine\nsize = 1\n\n# of the window\n[window]\nwidth = 3\n"},
      {"a new value where there are tables only", "# of the window\n[window]\nwidth = 3\n", 1,
       "size = 1\n# of the window\n[window]\nwidth = 3\n"},
      {"a value that goes", "# mine\nsize = 1  # in points\nfont = 'serif'", std::nullopt, "# mine\nfont = 'serif'"},
      {"a value that was not there", "# mine", std::nullopt, "# mine"},
      {"another table's value of that name", "# mine\n[window]\nsize = 1\n", 2, "size = 2\n# mine\n[window]\nsize = 1\n"},
      {"a date beside it", "size = 1\nday = 2026-11-22\n", 2, "size = 2\nday = 2026-11-22\n"},
      {"an inline table", "size = { width = 3 } # mine\n", 1, "size = 1 # mine\n"},
  };
  for (const auto& [what, before, value, after] : cases) {
    write(before);
    setInTomlFile(path, "size", value);
    EXPECT_EQ(content(), after) << what;
  }
}

TEST_F(TomlFile, HoldsTheRightValuesWhereItsCommentsCannotBeKept) {
  const struct {
    const char* before;
    std::optional<Value> value;
    Dictionary after;
  } cases[] = {
      {"# mine\n[size]\nwidth = 3\n", 1, {{"size", 1}}},
      {"[[size]]\nwidth = 3\n[[size]]\n", 1, {{"size", 1}}},
      {"size.width = 3 # mine\nfont = 'serif'\n", std::nullopt, {{"font", "serif"}}},
      {"font = 'serif' # mine\n[window]\n",
       Dictionary{{"width", 3}},
       {{"font", "serif"}, {"size", Dictionary{{"width", 3}}}, {"window", Dictionary()}}},
  };
  for (const auto& [before, value, after] : cases) {
    write(before);
    setInTomlFile(path, "size", value);
    EXPECT_EQ(readTomlFile(path), after) << before;
  }
}

TEST_F(TomlFile, ThatIsWrongIsNotWrittenOver) {
  write("size = \n");
  EXPECT_THROW(setInTomlFile(path, "size", 1), TomlError);
  EXPECT_EQ(content(), "size = \n");
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
