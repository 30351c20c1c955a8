#include "Host/Alert/AlertWords.h"

#include <gmock/gmock.h>

#include <set>
#include <string_view>

namespace palisade {
namespace {

TEST(AnAlertsWords, AreOfTheFirstLanguageThatHasAny) {
  EXPECT_EQ(alertWordsFor("de_AT:de:en").language, "de");
  EXPECT_EQ(alertWordsFor("tlh:pt_BR").language, "pt_BR");
  EXPECT_EQ(alertWordsFor("tlh").language, "en");
  EXPECT_EQ(alertWordsFor("").language, "en");
  EXPECT_EQ(alertWordsFor(":::").language, "en");
}

TEST(AnAlertsWords, SayInEveryLanguageHowMuchIsKnownAboutWhoAsks) {
  std::set<std::string_view> said;
  for (const char* language : {"en", "de", "fr", "es", "pt_BR", "it", "ru", "ja", "ko", "zh_CN", "zh_TW", "ar", "he"}) {
    const AlertWords& words = alertWordsFor(language);
    EXPECT_EQ(words.language, language);
    EXPECT_FALSE(words.keys.empty());
    for (const AlertCertainty certainty :
         {AlertCertainty::certain, AlertCertainty::likely, AlertCertainty::claimedInSandbox, AlertCertainty::claimed}) {
      EXPECT_FALSE(words.wordFor(certainty).empty());
      EXPECT_TRUE(said.insert(words.wordFor(certainty)).second) << words.wordFor(certainty) << " is said twice";
    }
  }
}

}  // namespace
}  // namespace palisade
