// What an application calls itself is shown on a terminal as data: it moves no cursor, and every line keeps its width.

#include "Host/Alert/TerminalText.h"

#include <gmock/gmock.h>

#include <string>

#include "Host/Alert/TerminalDialog.h"

namespace palisade {
namespace {

using testing::Each;
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
                    HarmlessCase{"BidirectionalOverrides", "a\u202Eb\u2066c\u2069d\u200Fe", "a b c d e"},
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

// The columns of each line of a dialog, without its escape sequences.
std::vector<std::size_t> lineWidths(std::string_view dialog) {
  std::vector<std::size_t> widths;
  std::string line;
  for (std::size_t position = 0; position < dialog.size(); ++position) {
    if (dialog[position] == '\x1b') {
      position = dialog.find('m', position);
    } else if (dialog[position] == '\r') {
      widths.push_back(columnsOf(line));
      line.clear();
      ++position;
    } else {
      line += dialog[position];
    }
  }
  return widths;
}

class ADialog : public testing::TestWithParam<std::size_t> {};

TEST_P(ADialog, KeepsItsFrameStraight) {
  const AlertDescription description{.header = "Use 写真 on Facebook?",
                                     .message =
                                         "“写真” would like to see \x1b[31m a very long list of things, all of them yours, "
                                         "and a word_that_is_far_too_long_for_any_terminal_that_people_use_today.",
                                     .alternateButtonTitle = "Don’t Allow",
                                     .defaultButtonTitle = "Allow"};
  const std::size_t columns = GetParam();
  EXPECT_THAT(lineWidths(drawDialog(description, DialogButton::defaultButton, columns)),
              Each(std::min<std::size_t>(columns, 80)));
}

INSTANTIATE_TEST_SUITE_P(OfAnyWidth, ADialog, testing::Values(34, 40, 61, 80, 200));

}  // namespace
}  // namespace palisade
