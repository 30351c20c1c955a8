#include "Host/Strings/LanguagePreference.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

using namespace palisade;
using testing::ElementsAre;
using testing::IsEmpty;

TEST(ALanguageName, LeadsToItsCatalogues) {
  const std::pair<std::string, std::vector<std::string>> cases[] = {
      {"de", {"de"}},
      {"de_DE", {"de_DE", "de"}},
      {"de_DE.UTF-8", {"de_DE", "de"}},
      {"de_DE.UTF-8@euro", {"de_DE", "de"}},
      {"de_DE@euro", {"de_DE", "de"}},
      {"DE_de", {"de_DE", "de"}},
      {"pt-BR", {"pt_BR", "pt"}},
      {"es-419", {"es_419", "es"}},
      {"sr-Latn-RS", {"sr_RS", "sr"}},
      {"sr_RS@latin", {"sr_RS", "sr"}},
      {"yue_HK", {"yue_HK", "yue"}},
      {"iw_IL.UTF-8", {"he_IL", "he"}},
      {"zh", {"zh_CN", "zh"}},
      {"zh_CN.GB18030", {"zh_CN", "zh"}},
      {"zh-SG", {"zh_SG", "zh_CN", "zh"}},
      {"zh_TW", {"zh_TW", "zh"}},
      {"zh-HK", {"zh_HK", "zh_TW", "zh"}},
      {"zh-Hant", {"zh_TW", "zh"}},
      {"zh_Hant", {"zh_TW", "zh"}},
      {"zh-Hant-HK", {"zh_HK", "zh_TW", "zh"}},
      {"zh-Hans", {"zh_CN", "zh"}},
      {"zh-Hans-HK", {"zh_CN", "zh"}},
      {"C", {"en"}},
      {"POSIX", {"en"}},
      {"C.UTF-8", {"en"}},
  };
  for (const auto& [name, catalogues] : cases) {
    SCOPED_TRACE(name);
    EXPECT_EQ(cataloguesForLanguage(name), catalogues);
  }
}

TEST(ANameThatIsNoLanguage, LeadsNowhere) {
  for (const char* name : {"", "d", "deutsch", "../de", "/etc", "d/e", "..", "12", "_DE", "@euro", ".UTF-8", "d\xC3\xA9"}) {
    SCOPED_TRACE(name);
    EXPECT_THAT(cataloguesForLanguage(name), IsEmpty());
  }
}

TEST(ANameWithAStrangeEnd, LeadsNoFurtherThanItsLanguage) {
  for (const char* name : {"de_../..", "de_/etc", "de-x-secret", "de_D"}) {
    SCOPED_TRACE(name);
    EXPECT_THAT(cataloguesForLanguage(name), ElementsAre("de"));
  }
}

TEST(PreferredCatalogues, EndWithEnglishAndNameEachOnce) {
  EXPECT_THAT(preferredCatalogues("de_AT"), ElementsAre("de_AT", "de", "en"));
  EXPECT_THAT(preferredCatalogues("zh_TW"), ElementsAre("zh_TW", "zh", "en"));
  EXPECT_THAT(preferredCatalogues("en_GB"), ElementsAre("en_GB", "en"));
  EXPECT_THAT(preferredCatalogues("C"), ElementsAre("en"));
  EXPECT_THAT(preferredCatalogues(""), ElementsAre("en"));
}
