#include "Host/Preferences/TomlPreferencesStore.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <fstream>
#include <functional>
#include <iterator>
#include <memory>
#include <optional>
#include <string>
#include <thread>
#include <vector>

#include "Host/Preferences/TomlFile.h"
#include "Tests/Host/TemporaryFolder.h"

namespace palisade {
namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::Optional;
using testing::ThrowsMessage;

const std::string domain = "com.example.editor";

class Preferences : public testing::Test {
 protected:
  std::filesystem::path fileOf(const std::string& name) const { return folder / (name + ".toml"); }
  void edit(const std::string& text) const { std::ofstream(fileOf(domain)) << text; }
  std::optional<Value> read(const std::string& key, const std::string& of = domain) {
    return store->copyValue(key, of, PreferencesUser::current, PreferencesHost::any);
  }

  const TemporaryFolder temporary;
  const std::filesystem::path folder = temporary.path() / "config" / "preferences";
  std::unique_ptr<TomlPreferencesStore> store = std::make_unique<TomlPreferencesStore>(folder);
};

TEST_F(Preferences, HaveAFolderForTheirOwnerAlone) {
  struct stat status {};
  ASSERT_EQ(stat(folder.c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 0777U, 0700U);
}

TEST_F(Preferences, ThatWereNeverSetAreNone) {
  EXPECT_EQ(read("colour"), std::nullopt);
  edit("size = 1\n");
  EXPECT_EQ(read("colour"), std::nullopt);
}

TEST_F(Preferences, KeepTheTypesOfTheirValues) {
  edit("text = \"1\"\nwhole = 1\nreal = 1.0\ntruth = true\nlist = [\"a\", 1]\n");
  EXPECT_THAT(read("text"), Optional(Value("1")));
  EXPECT_THAT(read("whole"), Optional(Value(1)));
  EXPECT_THAT(read("real"), Optional(Value(1.0)));
  EXPECT_THAT(read("truth"), Optional(Value(true)));
  EXPECT_THAT(read("list"), Optional(Value(Array{"a", 1})));
}

TEST_F(Preferences, OfOneDomainAreNotThoseOfAnother) {
  store->set(domain, "size", 1);
  store->set("com.example.viewer", "size", 2);
  EXPECT_THAT(read("size"), Optional(Value(1)));
  EXPECT_THAT(read("size", "com.example.viewer"), Optional(Value(2)));
}

TEST_F(Preferences, KeepTheOtherKeysWhenOneIsSetOrRemoved) {
  edit("size = 1\ncolour = \"red\"\n[window]\nwidth = 3\n");
  store->set(domain, "size", 2);
  store->set(domain, "font", "serif");
  store->set(domain, "colour", std::nullopt);
  const Dictionary expected{{"size", 2}, {"window", Dictionary{{"width", 3}}}, {"font", "serif"}};
  EXPECT_EQ(readTomlFile(fileOf(domain)), expected);
  EXPECT_THAT(read("size"), Optional(Value(2)));
  EXPECT_EQ(read("colour"), std::nullopt);
}

TEST_F(Preferences, StayForTheNextStore) {
  store->set(domain, "size", 2);
  store = std::make_unique<TomlPreferencesStore>(folder);
  EXPECT_THAT(read("size"), Optional(Value(2)));
}

TEST_F(Preferences, AreReadAgainAfterEveryKindOfChange) {
  const std::filesystem::path draft = folder / "draft";
  const std::filesystem::path elsewhere = temporary.path() / "elsewhere.toml";
  const std::filesystem::path file = fileOf(domain);
  writeTomlFile(elsewhere, {{"size", 7}});
  struct Change {
    std::string how;
    std::function<void()> make;
    std::optional<Value> size;
  };
  for (const auto& [how, make, size] : std::vector<Change>{
           {"written for the first time", [&] { edit("size = 1\n"); }, 1},
           {"written over", [&] { edit("size = 2\n"); }, 2},
           {"replaced",
            [&] {
              writeTomlFile(file, {{"size", 3}});
            },
            3},
           {"removed", [&] { std::filesystem::remove(file); }, std::nullopt},
           {"linked", [&] { std::filesystem::create_hard_link(elsewhere, file); }, 7},
           {"moved away", [&] { std::filesystem::rename(file, draft); }, std::nullopt},
           {"moved back", [&] { std::filesystem::rename(draft, file); }, 7},
           {"moved out of the folder", [&] { std::filesystem::rename(file, temporary.path() / "away"); }, std::nullopt},
           {"linked symbolically", [&] { std::filesystem::create_symlink(elsewhere, file); }, 7},
       }) {
    make();
    EXPECT_EQ(read("size"), size) << how;
  }
}

TEST_F(Preferences, AreReadAgainWhenAnotherProcessHasSetThem) {
  store->set(domain, "size", 1);
  ASSERT_THAT(read("size"), Optional(Value(1)));
  const pid_t child = fork();
  ASSERT_GE(child, 0);
  if (child == 0) {
    TomlPreferencesStore(folder).set(domain, "size", 2);
    _exit(0);
  }
  int status = 0;
  ASSERT_EQ(waitpid(child, &status, 0), child);
  ASSERT_EQ(status, 0);
  EXPECT_THAT(read("size"), Optional(Value(2)));
}

TEST_F(Preferences, AreReadAgainAfterTheirFolderWasReplaced) {
  store->set(domain, "size", 1);
  ASSERT_THAT(read("size"), Optional(Value(1)));
  std::filesystem::remove_all(folder);
  EXPECT_EQ(read("size"), std::nullopt);
  std::filesystem::create_directory(folder);
  edit("size = 2\n");
  EXPECT_THAT(read("size"), Optional(Value(2)));
  edit("size = 3\n");
  EXPECT_THAT(read("size"), Optional(Value(3)));
}

TEST_F(Preferences, AreReadWhenTheirFolderCouldOnlyBeMadeLater) {
  const std::filesystem::path inTheWay = temporary.path() / "file";
  std::ofstream(inTheWay) << "no folder";
  TomlPreferencesStore late(inTheWay / "preferences");
  const auto size = [&] { return late.copyValue("size", domain, PreferencesUser::current, PreferencesHost::any); };
  EXPECT_EQ(size(), std::nullopt);
  std::filesystem::remove(inTheWay);
  writeTomlFile((std::filesystem::create_directories(inTheWay / "preferences"), inTheWay / "preferences" / (domain + ".toml")),
                {{"size", 1}});
  EXPECT_THAT(size(), Optional(Value(1)));
}

TEST_F(Preferences, CostNoFileAccessWhileNothingChanges) {
  const std::filesystem::path elsewhere = temporary.path() / "elsewhere.toml";
  writeTomlFile(elsewhere, {{"size", 1}});
  std::filesystem::create_symlink(elsewhere, fileOf(domain));
  ASSERT_THAT(read("size"), Optional(Value(1)));
  // What stands in another folder is not watched, so only another access to it would show the change.
  writeTomlFile(elsewhere, {{"size", 2}});
  EXPECT_THAT(read("size"), Optional(Value(1)));
  store->synchronize(domain);
  EXPECT_THAT(read("size"), Optional(Value(2)));
}

TEST_F(Preferences, ThatCannotBeReadAreNamedUntilTheyCan) {
  edit("size = 1\n");
  ASSERT_THAT(read("size"), Optional(Value(1)));
  edit("size = 1\ncolour = red\n");
  for (int attempt = 0; attempt < 2; ++attempt) {
    EXPECT_THAT([&] { read("size"); },
                ThrowsMessage<TomlError>(AllOf(HasSubstr(fileOf(domain).string()), HasSubstr("line 2"))));
  }
  edit("size = 2\ncolour = \"red\"\n");
  EXPECT_THAT(read("size"), Optional(Value(2)));
}

TEST_F(Preferences, ThatCannotBeReadAreNotWrittenOver) {
  const std::string wrong = "size = 1\ncolour = red\n";
  edit(wrong);
  EXPECT_THROW(store->set(domain, "size", 2), TomlError);
  std::ifstream file(fileOf(domain));
  EXPECT_EQ(std::string(std::istreambuf_iterator<char>(file), {}), wrong);
}

TEST_F(Preferences, OfWhatIsNoDomainAreRefused) {
  for (const std::string& name : {std::string(), std::string("../accountd"), std::string("a/b"), std::string(".hidden"),
                                  std::string("a b"), std::string(201, 'a')}) {
    EXPECT_THAT([&] { read("size", name); }, ThrowsMessage<TomlError>(HasSubstr("'" + name + "' is no preferences domain")));
    EXPECT_THROW(store->set(name, "size", 1), TomlError);
  }
}

TEST_F(Preferences, AreSafeFromManyThreads) {
  std::vector<std::jthread> threads;
  for (int thread = 0; thread < 4; ++thread) {
    threads.emplace_back([this, own = "key" + std::to_string(thread)] {
      for (int value = 0; value < 20; ++value) {
        store->set(domain, own, value);
        EXPECT_THAT(read(own), Optional(Value(value)));
      }
    });
  }
}

}  // namespace
}  // namespace palisade
