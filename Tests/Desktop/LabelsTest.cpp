// The letters that press the buttons.

#include "AlertHelper/Labels.h"

#include <gmock/gmock.h>

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

}  // namespace
}  // namespace palisade
