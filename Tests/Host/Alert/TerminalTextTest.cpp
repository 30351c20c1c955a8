// What an application calls itself is shown on a terminal as data: it moves no cursor, and every line keeps its width.

#include "Host/Alert/TerminalText.h"

#include <gmock/gmock.h>

#include <string>

namespace palisade {
namespace {

using testing::ElementsAre;

struct HarmlessCase {
  const char* description;
  std::string text;
  std::string shown;
};

class AnyText : public testing::TestWithParam<HarmlessCase> {};

TEST_P(AnyText, IsShownWithoutControls) { EXPECT_EQ(harmless(GetParam().text), GetParam().shown); }

INSTANTIATE_TEST_SUITE_P(
    OfAnApplication, AnyText,
    testing::Values(HarmlessCase{"PlainText", "Photos “Ünïcode” 写真 🎈", "Photos “Ünïcode” 写真 🎈"},
                    HarmlessCase{"EscapeSequences", "\x1b[2JPhotos\x1b]0;x\x07", " [2JPhotos ]0;x "},
                    HarmlessCase{"LineBreaks", "a\nb\rc\u2028d\u2029e", "a b c d e"},
                    HarmlessCase{"Nul", std::string("a\0b", 3), "a b"}, HarmlessCase{"C1Controls", "a\u009b2Jb", "a 2Jb"},
                    HarmlessCase{"BidirectionalOverrides", "a\u202Eb\u2066c\u2069d\u200Fe\u061Cf", "abcdef"},
                    HarmlessCase{"BrokenUtf8", "a\xFF\xC3z", "a\uFFFD\uFFFDz"},
                    HarmlessCase{"OverlongAndSurrogate", "\xC0\x80\xED\xA0\x80", "\uFFFD\uFFFD\uFFFD\uFFFD\uFFFD"}),
    [](const auto& tested) { return tested.param.description; });

TEST(Columns, CountWideCharactersTwice) {
  EXPECT_EQ(columnsOf("Photos"), 6U);
  EXPECT_EQ(columnsOf("写真"), 4U);
  EXPECT_EQ(columnsOf("é"), 1U);
}

TEST(Wrapping, BreaksAtBlanks) { EXPECT_THAT(wrapped("the quick brown fox", 10), ElementsAre("the quick", "brown fox")); }

TEST(Wrapping, BreaksAWordThatIsTooLongWhereTheLineEnds) {
  EXPECT_THAT(wrapped("abcdefghij", 4), ElementsAre("abcd", "efgh", "ij"));
}

TEST(Wrapping, CountsColumnsAndNotBytes) { EXPECT_THAT(wrapped("写真写真 写真", 8), ElementsAre("写真写真", "写真")); }

TEST(Wrapping, GivesNoTextOneEmptyLine) { EXPECT_THAT(wrapped("", 8), ElementsAre("")); }

}  // namespace
}  // namespace palisade
