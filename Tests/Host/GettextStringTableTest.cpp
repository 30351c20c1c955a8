#include "Host/Strings/GettextStringTable.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <fstream>
#include <iterator>
#include <optional>
#include <random>
#include <string>
#include <thread>
#include <vector>

#include "Tests/Host/CatalogueBytes.h"
#include "Tests/Host/TemporaryFolder.h"

using namespace palisade;
using testing::IsEmpty;

namespace {

/// The four variables that name the user's language, as a test sets them. The old ones come back at the end.
class LanguageEnvironment : public testing::Test {
 protected:
  LanguageEnvironment() {
    for (const char* name : names) {
      const char* value = std::getenv(name);
      _before.emplace_back(value != nullptr ? std::optional<std::string>(value) : std::nullopt);
      unsetenv(name);
    }
  }

  ~LanguageEnvironment() override {
    for (std::size_t index = 0; index < std::size(names); ++index) {
      if (_before[index]) {
        setenv(names[index], _before[index]->c_str(), 1);
      } else {
        unsetenv(names[index]);
      }
    }
  }

  static constexpr const char* names[] = {"LANGUAGE", "LC_ALL", "LC_MESSAGES", "LANG"};

 private:
  std::vector<std::optional<std::string>> _before;
};

using AStringTable = LanguageEnvironment;

std::string textOf(const GettextStringTable& table, std::string_view key) {
  return table.localizedString(key, "default", "Localizable");
}

void writeCatalogue(const std::filesystem::path& folder, const std::string& language, const std::string& bytes) {
  const std::filesystem::path messages = folder / language / "LC_MESSAGES";
  std::filesystem::create_directories(messages);
  std::ofstream(messages / "Localizable.mo", std::ios::binary) << bytes;
}

}  // namespace

TEST_F(AStringTable, FallsBackFromTheRegionToTheLanguageToEnglishToTheDefault) {
  const GettextStringTable table(LANGUAGES_FOLDER, "de_AT.UTF-8@euro");
  EXPECT_EQ(textOf(table, "GREETING"), "Servus, „%@“");
  EXPECT_EQ(textOf(table, "FAREWELL"), "Auf Wiedersehen");
  EXPECT_EQ(textOf(table, "ENGLISH_ONLY"), "only in English");
  EXPECT_EQ(textOf(table, "NOWHERE"), "default");
}

TEST_F(AStringTable, KeepsToItsFixedLanguage) {
  setenv("LANGUAGE", "de", 1);
  EXPECT_EQ(textOf(GettextStringTable(LANGUAGES_FOLDER, "zh-Hant"), "GREETING"), "您好，「%@」");
  EXPECT_EQ(textOf(GettextStringTable(LANGUAGES_FOLDER, "C"), "GREETING"), "Hello, “%@”");
  EXPECT_EQ(textOf(GettextStringTable(LANGUAGES_FOLDER, "tlh"), "GREETING"), "Hello, “%@”");
  EXPECT_EQ(textOf(GettextStringTable(LANGUAGES_FOLDER, "../Languages/de"), "GREETING"), "Hello, “%@”");
}

TEST_F(AStringTable, AsksTheFirstVariableThatSaysSomething) {
  const GettextStringTable table(LANGUAGES_FOLDER);
  EXPECT_EQ(textOf(table, "FAREWELL"), "Goodbye");
  setenv("LANG", "de_DE.UTF-8", 1);
  EXPECT_EQ(textOf(table, "FAREWELL"), "Auf Wiedersehen");
  setenv("LC_MESSAGES", "C", 1);
  EXPECT_EQ(textOf(table, "FAREWELL"), "Goodbye");
  setenv("LC_ALL", "de_CH", 1);
  EXPECT_EQ(textOf(table, "FAREWELL"), "Auf Wiedersehen");
  setenv("LANGUAGE", "en", 1);
  EXPECT_EQ(textOf(table, "FAREWELL"), "Goodbye");
  setenv("LANGUAGE", "", 1);
  EXPECT_EQ(textOf(table, "FAREWELL"), "Auf Wiedersehen");
}

TEST_F(AStringTable, GoesThroughTheListOfLanguages) {
  const GettextStringTable table(LANGUAGES_FOLDER);
  setenv("LANGUAGE", "tlh:../de:zh_TW:de", 1);
  EXPECT_EQ(textOf(table, "GREETING"), "您好，「%@」");
  EXPECT_EQ(textOf(table, "FAREWELL"), "Auf Wiedersehen");
  EXPECT_EQ(textOf(table, "ENGLISH_ONLY"), "only in English");
}

TEST_F(AStringTable, TakesAnEmptyTextForAMissingOne) {
  const TemporaryFolder folder;
  writeCatalogue(folder.path(), "en", catalogueBytes({{"A", "a in English"}, {"B", ""}}));
  writeCatalogue(folder.path(), "de", catalogueBytes({{"A", ""}}));
  const GettextStringTable table(folder.path(), "de");
  EXPECT_EQ(textOf(table, "A"), "a in English");
  EXPECT_EQ(textOf(table, "B"), "default");
}

TEST_F(AStringTable, HasNoTextForTheEmptyKey) { EXPECT_EQ(textOf(GettextStringTable(LANGUAGES_FOLDER, "de"), ""), "default"); }

TEST_F(AStringTable, TakesKeysAndTablesAsTheyStand) {
  using namespace std::string_view_literals;
  const GettextStringTable table(LANGUAGES_FOLDER, "de");
  EXPECT_EQ(textOf(table, "GREETING\0"sv), "default");
  EXPECT_EQ(textOf(table, "greeting"), "default");
  for (const std::string_view name :
       {"Other"sv, ""sv, "../LC_MESSAGES/Localizable"sv, "Localizable/UTF-8"sv, "Localizable\0"sv}) {
    EXPECT_EQ(table.localizedString("GREETING", "default", name), "default") << name;
  }
}

TEST_F(AStringTable, AnswersTheDefaultWhereThereAreNoCatalogues) {
  EXPECT_EQ(textOf(GettextStringTable("/nowhere", "de"), "GREETING"), "default");
  EXPECT_THAT(GettextStringTable("/nowhere").localizedString("GREETING", "", "Localizable"), IsEmpty());
}

TEST_F(AStringTable, PassesOverADamagedCatalogue) {
  const TemporaryFolder folder;
  const std::string whole = catalogueBytes({{"GREETING", "Hallo"}});
  writeCatalogue(folder.path(), "en", catalogueBytes({{"GREETING", "Hello"}}));
  for (const std::string& damaged : {std::string(), std::string("no catalogue"), whole.substr(0, whole.size() - 1)}) {
    writeCatalogue(folder.path(), "de", damaged);
    EXPECT_EQ(textOf(GettextStringTable(folder.path(), "de"), "GREETING"), "Hello");
  }
  writeCatalogue(folder.path(), "de", whole);
  EXPECT_EQ(textOf(GettextStringTable(folder.path(), "de"), "GREETING"), "Hallo");
}

TEST_F(AStringTable, LosesNoMoreThanTextsToDamage) {
  const TemporaryFolder folder;
  std::ifstream compiled(std::filesystem::path(LANGUAGES_FOLDER) / "de/LC_MESSAGES/Localizable.mo", std::ios::binary);
  const std::string whole{std::istreambuf_iterator<char>(compiled), std::istreambuf_iterator<char>()};
  ASSERT_FALSE(whole.empty());
  std::mt19937 random(20251121);
  int kept = 0;
  for (int round = 0; round < 1'000; ++round) {
    std::string bytes = whole;
    for (unsigned change = random() % 3 + 1; change > 0; --change) bytes[random() % bytes.size()] = static_cast<char>(random());
    writeCatalogue(folder.path(), "de", bytes);
    const GettextStringTable table(folder.path(), "de");
    textOf(table, "GREETING");
    if (textOf(table, "FAREWELL") == "Auf Wiedersehen") ++kept;
  }
  EXPECT_GT(kept, 100);
  EXPECT_LT(kept, 900);
}

TEST_F(AStringTable, AnswersManyThreadsAtOnce) {
  setenv("LANGUAGE", "de_AT:zh_TW", 1);
  const GettextStringTable table(LANGUAGES_FOLDER);
  std::vector<std::string> wrong(8);
  {
    std::vector<std::jthread> threads;
    for (std::string& problem : wrong) {
      threads.emplace_back([&table, &problem] {
        for (int round = 0; round < 500; ++round) {
          if (textOf(table, "GREETING") != "Servus, „%@“") problem = "GREETING";
          if (textOf(table, "FAREWELL") != "Auf Wiedersehen") problem = "FAREWELL";
          if (textOf(table, "ENGLISH_ONLY") != "only in English") problem = "ENGLISH_ONLY";
          if (table.localizedString("GREETING", "none", "Table" + std::to_string(round % 20)) != "none")
            problem = "other table";
        }
      });
    }
  }
  EXPECT_THAT(wrong, testing::Each(IsEmpty()));
}
