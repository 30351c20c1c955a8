#include "Host/Alert/AlertWords.h"

#include <gmock/gmock.h>

namespace palisade {
namespace {

TEST(AnAlertsWords, AreOfTheFirstLanguageThatHasAny) {
  EXPECT_EQ(alertWordsFor("de_AT:de:en").language, "de");
  EXPECT_EQ(alertWordsFor("tlh:pt_BR").language, "pt_BR");
  EXPECT_EQ(alertWordsFor("tlh").language, "en");
  EXPECT_EQ(alertWordsFor("").language, "en");
  EXPECT_EQ(alertWordsFor(":::").language, "en");
}

}  // namespace
}  // namespace palisade
