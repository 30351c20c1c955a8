// What goes to the desktop helper: texts that cannot change how the sentence around them reads, in a frame that comes back
// whole.

#include "Host/Alert/AlertQuestion.h"

#include <gmock/gmock.h>

namespace palisade {
namespace {

AlertQuestion example() {
  return {.title = "Facebook",
          .message = "“Photos” asks.",
          .refuseTitle = "Don’t Allow",
          .allowTitle = "Allow",
          .subject = AlertSubject{.applicationName = "Photos",
                                  .applicationID = "org.example.photos",
                                  .certainty = AlertCertainty::certain,
                                  .account = "ada"},
          .languages = "de:en",
          .topMost = true,
          .networkDisplay = "localhost:10.0",
          .nonce = freshNonce()};
}

std::optional<AlertQuestion> readBack(const std::string& frame) {
  const auto length = lengthOfAlertQuestion(frame);
  return length == frame.size() - 4 ? alertQuestionFromJson(std::string_view(frame).substr(4)) : std::nullopt;
}

TEST(AQuestion, ComesBackWhole) {
  const AlertQuestion question = example();
  const auto read = readBack(alertQuestionFrame(question).value());
  ASSERT_TRUE(read);
  EXPECT_EQ(read->title, question.title);
  EXPECT_EQ(read->message, question.message);
  EXPECT_EQ(read->refuseTitle, question.refuseTitle);
  EXPECT_EQ(read->allowTitle, question.allowTitle);
  EXPECT_EQ(read->languages, question.languages);
  EXPECT_EQ(read->topMost, question.topMost);
  EXPECT_EQ(read->networkDisplay, question.networkDisplay);
  EXPECT_EQ(read->nonce, question.nonce);
  ASSERT_TRUE(read->subject);
  EXPECT_EQ(read->subject->applicationName, "Photos");
  EXPECT_EQ(read->subject->applicationID, "org.example.photos");
  EXPECT_EQ(read->subject->certainty, AlertCertainty::certain);
  EXPECT_EQ(read->subject->account, "ada");
}

TEST(AQuestion, KeepsHowMuchIsKnownAboutWhoAsks) {
  for (const AlertCertainty certainty :
       {AlertCertainty::certain, AlertCertainty::likely, AlertCertainty::claimedInSandbox, AlertCertainty::claimed}) {
    AlertQuestion question = example();
    question.subject->certainty = certainty;
    const auto read = readBack(alertQuestionFrame(question).value());
    ASSERT_TRUE(read && read->subject);
    EXPECT_EQ(read->subject->certainty, certainty);
  }
}

TEST(AQuestion, MayLeaveOpenWhoAsks) {
  AlertQuestion question = example();
  question.subject.reset();
  const auto read = readBack(alertQuestionFrame(question).value());
  ASSERT_TRUE(read);
  EXPECT_FALSE(read->subject);
}

TEST(AQuestion, HasANumberThatNoOtherHas) { EXPECT_NE(freshNonce(), freshNonce()); }

TEST(AQuestionThatIsCutOff, IsNone) {
  const std::string json = alertQuestionFrame(example()).value().substr(4);
  for (std::size_t length = 0; length < json.size(); ++length) EXPECT_FALSE(alertQuestionFromJson(json.substr(0, length)));
}

TEST(AQuestionWithAMemberOfAnotherType, IsNone) {
  const std::string json = alertQuestionFrame(example()).value().substr(4);
  for (const char* member :
       {"nonce", "title", "message", "refuse", "allow", "languages", "topmost", "display", "subject", "name"}) {
    std::string broken = json;
    broken.replace(broken.find("\"" + std::string(member) + "\"") + 1, 1, "X");
    const auto read = alertQuestionFromJson(broken);
    EXPECT_TRUE(!read || !read->subject) << member;
  }
}

TEST(ALongLength, IsRefused) { EXPECT_FALSE(lengthOfAlertQuestion("\xFF\xFF\xFF\xFF")); }

TEST(OneLine, HoldsNothingThatMovesOrTurnsText) {
  EXPECT_EQ(oneLine(" a\nb\t c\x1b[1m  "), "a b c [1m");
  EXPECT_EQ(oneLine("a\u202Eb\u2066c\u2069\u2028d"), "abc d");
  EXPECT_EQ(oneLine("“א\u200F”"), "“א\u200F”");
  EXPECT_EQ(oneLine("a\xE2\x80"), "a\uFFFD\uFFFD");
}

TEST(AName, IsIsolatedWhereverItStands) {
  EXPECT_EQ(isolated("“אב” and “אב”", "אב"), "“\u2068אב\u2069” and “\u2068אב\u2069”");
  EXPECT_EQ(isolated("“Photos” asks.", "Mail"), "“Photos” asks.");
  EXPECT_EQ(isolated("asks.", ""), "asks.");
}

}  // namespace
}  // namespace palisade
