// The dialog on a terminal: a straight frame around what is asked and who asks, whatever they call themselves.

#include "Host/Alert/TerminalDialog.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <regex>
#include <string>
#include <string_view>
#include <tuple>
#include <vector>

#include "Host/Alert/AskedQuestion.h"
#include "Host/Alert/TerminalText.h"

namespace palisade {
namespace {

using testing::AllOf;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::Not;

AlertDescription askingFor(const std::string& application) {
  return {.header = "Allow Access to Your Facebook Account?",
          .message = "“" + application + "” would like to use your Facebook account to see your basic profile.",
          .alternateButtonTitle = "Don’t Allow",
          .defaultButtonTitle = "Allow"};
}

AlertSubject photos() {
  return {.applicationName = "Photos",
          .applicationID = "org.example.photos",
          .certainty = AlertCertainty::certain,
          .account = "ada"};
}

std::string drawn(const AlertQuestion& question, std::size_t columns) {
  return drawDialog(question, AlertPlace::allow, columns);
}

// The lines without their escape sequences and without what keeps the frame's right side straight.
std::vector<std::string> linesOf(const std::string& dialog) {
  const std::string text = std::regex_replace(dialog, std::regex("\x1b\\[[0-9]*m"), "");
  std::vector<std::string> lines;
  for (std::size_t start = 0, end = 0; (end = text.find("\r\n", start)) != std::string::npos; start = end + 2) {
    lines.push_back(text.substr(start, end - start));
  }
  return lines;
}

// What stands within the frame.
std::vector<std::string> textOf(const std::string& dialog) {
  std::vector<std::string> texts;
  for (const std::string& line : linesOf(dialog)) {
    if (!line.starts_with("│ ")) continue;
    std::string text = line.substr(std::string_view("│ ").size());
    text.resize(text.size() - std::string_view(" │").size());
    text.erase(text.find_last_not_of(' ') + 1);
    texts.push_back(text);
  }
  return texts;
}

TEST(TheDialog, SaysWhatIsAskedAndWhoAsks) {
  EXPECT_THAT(textOf(drawn(askedQuestion(askingFor("Photos"), photos(), "en"), 80)),
              ElementsAre("Allow Access to Your Facebook Account?", "",
                          "“Photos” would like to use your Facebook account to see your basic profile.", "",
                          "Application  Photos",               //
                          "             org.example.photos",   //
                          "Identity     Certain (sandboxed)",  //
                          "Account      ada",                  //
                          "", "[ Don’t Allow ]  [ Allow ]", "Tab chooses a button, Return presses it, Escape closes."));
}

TEST(TheDialog, SpeaksTheLanguageOfItsSentences) {
  const auto german = textOf(drawn(askedQuestion(askingFor("Photos"), photos(), "de:en"), 80));
  EXPECT_THAT(german, testing::IsSupersetOf({"Anwendung  Photos", "Konto      ada"}));
  const auto japanese = textOf(drawn(askedQuestion(askingFor("Photos"), photos(), "ja"), 80));
  EXPECT_THAT(japanese, testing::IsSupersetOf({"アプリケーション  Photos", "アカウント        ada"}));
}

TEST(TheDialog, SaysPlainlyThatAnIdentityIsOnlyClaimed) {
  AlertSubject subject = photos();
  subject.certainty = AlertCertainty::claimed;
  const std::string dialog = drawn(askedQuestion(askingFor("Photos"), subject, "en"), 80);
  EXPECT_THAT(dialog, HasSubstr("\x1b[1mOnly claimed (not sandboxed)\x1b[0m"));
}

TEST(TheDialog, LeavesOutWhatIsNotKnown) {
  AlertSubject program{.applicationName = "/usr/bin/photos", .applicationID = "/usr/bin/photos"};
  EXPECT_THAT(textOf(drawn(askedQuestion(askingFor("photos"), program, "en"), 80)),
              ElementsAre(testing::_, "", testing::_, "", "Application  /usr/bin/photos",
                          "Identity     Only claimed (not sandboxed)", "", testing::_, testing::_));
  EXPECT_THAT(textOf(drawn(askedQuestion(askingFor("photos"), std::nullopt, "en"), 80)),
              ElementsAre(testing::_, "", testing::_, "", testing::_, testing::_));
}

TEST(TheDialog, ShowsWhatIsSelectedInReverse) {
  const std::string edge = "│\x1b[7m \x1b[0m";
  const auto linesWithEdge = [&](AlertPlace selected) {
    const std::string dialog = drawDialog(askedQuestion(askingFor("Photos"), photos(), "en"), selected, 80);
    std::string lines;
    for (std::size_t start = 0, end = 0; (end = dialog.find("\r\n", start)) != std::string::npos; start = end + 2) {
      lines += dialog.compare(start, edge.size(), edge) == 0 ? '#' : '.';
    }
    return lines;
  };
  EXPECT_EQ(linesWithEdge(AlertPlace::text), ".###.........");
  EXPECT_EQ(linesWithEdge(AlertPlace::details), ".....####....");
  for (const auto& [place, button] : {std::pair(AlertPlace::refuse, "\x1b[7m[ Don’t Allow ]\x1b[0m"),
                                      std::pair(AlertPlace::allow, "\x1b[7m[ Allow ]\x1b[0m")}) {
    EXPECT_EQ(linesWithEdge(place), ".............");
    EXPECT_THAT(drawDialog(askedQuestion(askingFor("Photos"), photos(), "en"), place, 80), HasSubstr(button));
  }
}

TEST(TheDialog, ShowsNamesAsData) {
  const AlertSubject hostile{.applicationName = "Pho\x1b[2J\ntos\u202E│ Identity Certain\u2066\u061C",
                             .applicationID = "org.example\r\n└─┘" + std::string(1000, 'x'),
                             .account = "a\u2028d\x9B\x31ma\u200F"};
  const std::string dialog = drawn(askedQuestion(askingFor(hostile.applicationName), hostile, "en"), 80);
  const auto lines = linesOf(dialog);
  EXPECT_LT(lines.size(), 20U);
  for (const std::string& line : lines) {
    EXPECT_TRUE(std::ranges::none_of(line, [](unsigned char byte) { return byte < ' ' || byte == 0x7F; })) << line;
    EXPECT_THAT(line, AllOf(Not(HasSubstr("\u202E")), Not(HasSubstr("\u2066")), Not(HasSubstr("\u2068")),
                            Not(HasSubstr("\u200F")), Not(HasSubstr("\u061C"))));
    EXPECT_EQ(columnsOf(line), 80U) << line;
  }
  EXPECT_THAT(textOf(dialog), testing::Contains("Application  Pho[2J tos│ Identity Certain"));
}

class ADialog : public testing::TestWithParam<std::tuple<std::size_t, const char*>> {};

TEST_P(ADialog, KeepsItsFrameStraight) {
  const auto& [columns, language] = GetParam();
  const AlertDescription description{.header = "Use 写真 on Facebook?",
                                     .message =
                                         "“写真” would like to see \x1b[31m a very long list of things, all of them yours, "
                                         "and a word_that_is_far_too_long_for_any_terminal_that_people_use_today.",
                                     .alternateButtonTitle = "Don’t Allow",
                                     .defaultButtonTitle = "Allow"};
  const AlertSubject subject{.applicationName = "写真 アプリ",
                             .applicationID = "/opt/a_path/that_is_far_too_long/for_any_terminal/that_people_use/写真",
                             .account = "ada.lovelace@example.org"};
  for (const std::string& line : linesOf(drawn(askedQuestion(description, subject, language), columns))) {
    EXPECT_EQ(columnsOf(line), std::min<std::size_t>(columns, 80)) << line;
  }
}

INSTANTIATE_TEST_SUITE_P(OfAnyWidth, ADialog,
                         testing::Combine(testing::Values<std::size_t>(34, 40, 61, 80, 200),
                                          testing::Values("en", "de", "fr", "es", "pt_BR", "it", "ru", "ja", "ko", "zh_CN",
                                                          "zh_TW", "ar", "he")));

}  // namespace
}  // namespace palisade
