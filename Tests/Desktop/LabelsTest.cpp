// The letters that lead to the buttons.

#include "AlertHelper/Labels.h"

#include <gmock/gmock.h>

namespace palisade {
namespace {

TEST(ButtonLabels, UnderlineALetterEach) {
  struct Row {
    const char *refuse, *allow, *refuseLabel, *allowLabel;
    char refuseLetter, allowLetter;
  };
  for (const Row& row :
       {Row{"Don’t Allow", "Allow", "_Don’t Allow", "_Allow", 'd', 'a'},
        Row{"Nicht erlauben", "Erlauben", "_Nicht erlauben", "_Erlauben", 'n', 'e'},
        Row{"Ablehnen", "Annehmen", "A_blehnen", "_Annehmen", 'b', 'a'}, Row{"許可しない", "許可", "許可しない", "許可", 0, 0},
        Row{"a_a", "a", "a__a", "_a", 0, 'a'}, Row{"", "", "", "", 0, 0}}) {
    const ButtonLabels labels = buttonLabels(row.refuse, row.allow);
    EXPECT_EQ(labels.refuse, row.refuseLabel);
    EXPECT_EQ(labels.allow, row.allowLabel);
    EXPECT_EQ(labels.refuseLetter, row.refuseLetter);
    EXPECT_EQ(labels.allowLetter, row.allowLetter);
  }
}

}  // namespace
}  // namespace palisade
