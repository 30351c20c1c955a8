// The letters that press the buttons, and the window's own words.

#include "AlertHelper/Labels.h"

#include <gmock/gmock.h>

#include "AlertHelper/Words.h"

namespace palisade {
namespace {

TEST(ButtonLabels, UnderlineALetterEach) {
  struct Row {
    const char *refuse, *allow, *refuseLabel, *allowLabel;
  };
  for (const Row& row : {Row{"Don’t Allow", "Allow", "_Don’t Allow", "_Allow"},
                         Row{"Nicht erlauben", "Erlauben", "_Nicht erlauben", "_Erlauben"},
                         Row{"Ablehnen", "Annehmen", "A_blehnen", "_Annehmen"}, Row{"許可しない", "許可", "許可しない", "許可"},
                         Row{"a_a", "a", "a__a", "_a"}, Row{"", "", "", ""}}) {
    const ButtonLabels labels = buttonLabels(row.refuse, row.allow);
    EXPECT_EQ(labels.refuse, row.refuseLabel);
    EXPECT_EQ(labels.allow, row.allowLabel);
  }
}

TEST(TheWindowsWords, AreOfTheFirstLanguageThatHasAny) {
  EXPECT_EQ(wordsFor("de_AT:de:en").language, "de");
  EXPECT_EQ(wordsFor("tlh:pt_BR").language, "pt_BR");
  EXPECT_EQ(wordsFor("tlh").language, "en");
  EXPECT_EQ(wordsFor("").language, "en");
  EXPECT_EQ(wordsFor(":::").language, "en");
}

}  // namespace
}  // namespace palisade
