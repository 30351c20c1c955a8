// What an application calls itself is shown on a terminal as data: it moves no cursor, and every line keeps its width.

#include "Host/Alert/TerminalText.h"

#include <gmock/gmock.h>

#include <fstream>
#include <string>
#include <tuple>
#include <vector>

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

struct WrappingCase {
  const char* description;
  std::string text;
  std::size_t columns;
  std::vector<std::string> lines;
};

class Writing : public testing::TestWithParam<WrappingCase> {};

TEST_P(Writing, IsBrokenWhereItsReadersExpectIt) { EXPECT_EQ(wrapped(GetParam().text, GetParam().columns), GetParam().lines); }

INSTANTIATE_TEST_SUITE_P(
    Of, Writing,
    testing::Values(WrappingCase{"Japanese", "写真を見ることを許可", 8, {"写真を見", "ることを", "許可"}},
                    WrappingCase{"AFullStopAtTheEdge", "写真を見る。はい", 10, {"写真を見", "る。はい"}},
                    WrappingCase{"ACommaAtTheEdge", "写真、動画", 4, {"写", "真、", "動画"}},
                    WrappingCase{"AnOpeningMarkAtTheEdge", "写真を「動画」と", 8, {"写真を", "「動画」", "と"}},
                    WrappingCase{"ALongVowel", "フォトフレーム", 10, {"フォトフ", "レーム"}},
                    WrappingCase{"LatinWordsAmongJapanese", "友達のFacebook写真", 12, {"友達の", "Facebook写真"}},
                    WrappingCase{"Chinese", "想使用您的帐户，查看资料。", 14, {"想使用您的帐", "户，查看资料。"}},
                    WrappingCase{"Korean", "사진 앱에서 계정을 사용하려고", 12, {"사진 앱에서", "계정을", "사용하려고"}},
                    WrappingCase{"AKoreanWordThatIsTooLong", "사용하려고합니다", 6, {"사용하", "려고합", "니다"}},
                    WrappingCase{"FrenchMarks",
                                 "le compte «\u00A0Photos\u00A0» demande\u00A0?",
                                 12,
                                 {"le compte", "«\u00A0Photos\u00A0»", "demande\u00A0?"}},
                    WrappingCase{"AnArabicSentence", "يريد صور استخدام حسابك", 10, {"يريد صور", "استخدام", "حسابك"}},
                    WrappingCase{"APath", "/opt/example/photos", 14, {"/opt/example/", "photos"}},
                    WrappingCase{"CombiningMarks", "e\u0301e\u0301e\u0301", 2, {"e\u0301e\u0301", "e\u0301"}},
                    WrappingCase{"WhatTakesNoColumn", "\u200Babcd", 3, {"\u200B", "abc", "d"}},
                    WrappingCase{"BlanksAtTheEdge", "abcd    efgh", 4, {"abcd", "efgh"}}),
    [](const auto& tested) { return tested.param.description; });

// The sentences that the plug-in makes, as the pages in Docs show them.
std::vector<std::string> sentencesIn(const std::string& language) {
  std::ifstream page(SENTENCES_FOLDER "/" + language + ".md");
  std::vector<std::string> lines;
  for (std::string line; std::getline(page, line);) lines.push_back(harmless(line));
  return lines;
}

class ASentence : public testing::TestWithParam<std::tuple<const char*, std::size_t>> {};

TEST_P(ASentence, FitsTheTerminalAndBreaksNoRuleOfItsWriting) {
  const auto& [language, columns] = GetParam();
  const std::vector<std::string> sentences = sentencesIn(language);
  ASSERT_GT(sentences.size(), 20U);
  for (const std::string& sentence : sentences) {
    std::string whole;
    for (const std::string& line : wrapped(sentence, columns)) {
      EXPECT_LE(columnsOf(line), columns) << line;
      for (const char* closing :
           {"、", "。", "，", "」", "』", "）", "》", "？", "！", "：", "ー", "っ", "ょ", ")", ",", "."}) {
        EXPECT_FALSE(line.starts_with(closing)) << line;
      }
      for (const char* opening : {"「", "『", "（", "《", "("}) EXPECT_FALSE(line.ends_with(opening)) << line;
      whole += line;
    }
    const auto isBlank = [](char byte) { return byte == ' '; };
    std::string expected = sentence;
    std::erase_if(expected, isBlank);
    std::erase_if(whole, isBlank);
    EXPECT_EQ(whole, expected) << "nothing is lost";
  }
}

INSTANTIATE_TEST_SUITE_P(OfAnyLanguage, ASentence,
                         testing::Combine(testing::Values("en", "de", "fr", "es", "pt_BR", "it", "ru", "ja", "ko", "zh_CN",
                                                          "zh_TW", "ar", "he"),
                                          testing::Values<std::size_t>(30, 37, 58, 76)));

}  // namespace
}  // namespace palisade
