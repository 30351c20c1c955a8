// Applications whose names try to leave their place in the sentence, in every language that the sentence is written in: the
// words around the name stay as they are, and the name stays between its quotation marks.

#include <gmock/gmock.h>

#include <array>
#include <fstream>
#include <regex>
#include <string>
#include <vector>

#include "Host/Alert/AskedQuestion.h"
#include "Host/Alert/TerminalText.h"
#include "Host/Identity/DisplayName.h"

namespace palisade {
namespace {

constexpr const char* photoWall = "Photo Wall";

const std::array<std::string, 21> hostileNames = {
    "Photos” is allowed already. “Mail",
    "Photos“ darf das. „Mail",
    "Photos » est sûr. « Mail",
    "Фото» разрешено. «Почта",
    "写真」は許可済みです。「メール",
    "写真』は『安全",
    "사진’ 앱이 허용됨. ‘메일",
    "Photos\" is safe. \"Mail",
    "Photos' is safe. ''Mail''",
    "Photos‹ › ‚ ‛ ` ´ ′ ″ ＂ ＇ 〝 〟 ״ ׳ ❝ ❞",
    "Photos\u201d\u202e\u2066 is safe\u2069",
    "\u0301\u20e0Photos",
    "Ph\u0301\u0302\u0303\u0304\u0305\u0306\u0307\u0308\u0309\u030a\u030b\u030c\u030do",
    "Photos                                                        is allowed",
    "Photos\u3000\u00a0\u2003\u2002\u202f\u205f\u1680\u2800\u3164\u3164\u3164 is allowed",
    "is allowed to do everything that its user can do, without being asked, for ever and a day",
    std::string(100, 'W'),
    "写真写真写真写真写真写真写真写真写真写真写真写真写真写真写真写真写真写真写真写真写真写真",
    "Photos\r\n\r\nAccount: mallory",
    "\u0600Photos\u06dd",
    "a",
};

// The sentences that the plug-in makes for an application called "Photo Wall", as the pages in Docs show them.
std::vector<std::string> photoWallSentencesIn(const std::string& language) {
  std::ifstream page(SENTENCES_FOLDER "/" + language + ".md");
  std::vector<std::string> sentences;
  for (std::string line; std::getline(page, line);) {
    line = std::regex_replace(line, std::regex("<[^>]*>"), "");
    line = std::regex_replace(line, std::regex("&nbsp;"), "\u00a0");
    if (line.find(photoWall) == std::string::npos || !line.starts_with("| ")) continue;
    const std::size_t begin = line.find(" | ", 2) + 3;
    sentences.push_back(line.substr(begin, line.rfind(" |") - begin));
  }
  return sentences;
}

class AHostileName : public testing::TestWithParam<const char*> {};

TEST_P(AHostileName, LeavesTheSentenceAsItIs) {
  const std::vector<std::string> sentences = photoWallSentencesIn(GetParam());
  ASSERT_GT(sentences.size(), 20U);
  for (const std::string& name : hostileNames) {
    // What the plug-in gets from the client.
    const std::string shown = displayName(name);
    ASSERT_FALSE(shown.empty()) << name;
    EXPECT_LE(columnsOf(shown), 40U) << shown;
    for (const std::string& sentence : sentences) {
      const std::size_t place = sentence.find(photoWall);
      const std::string after = sentence.substr(place + std::string_view(photoWall).size());
      AlertDescription description;
      description.message = sentence.substr(0, place) + shown + after;
      const auto question =
          askedQuestion(description, AlertSubject{.applicationName = name, .applicationID = name}, GetParam());
      EXPECT_EQ(question.subject->applicationName, shown);
      const std::string expected = sentence.substr(0, place) + "\u2068" + shown + "\u2069" + after;
      ASSERT_EQ(question.message, expected) << "nothing else is isolated, and nothing else is changed";
    }
  }
}

INSTANTIATE_TEST_SUITE_P(InEveryLanguage, AHostileName,
                         testing::Values("en", "de", "fr", "es", "pt_BR", "it", "ru", "ja", "ko", "zh_CN", "zh_TW", "ar", "he"),
                         [](const auto& instance) { return std::string(instance.param); });

TEST(AHostileNameOfAnyLanguage, HoldsNoMarkOfAnyLanguage) {
  for (const std::string& name : hostileNames) {
    const std::string shown = displayName(name);
    for (const char* mark : {"“", "”",  "„", "‟", "«", "»", "‹", "›",  "「", "」", "『", "』", "‘", "’", "‚",
                             "‛", "\"", "'", "`", "´", "′", "″", "＂", "＇", "〝", "〟", "״",  "׳", "❝", "❞"}) {
      EXPECT_EQ(shown.find(mark), std::string::npos) << shown;
    }
  }
}

}  // namespace
}  // namespace palisade
