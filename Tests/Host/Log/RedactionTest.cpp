#include "Host/Log/Redaction.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "Platform/Format.h"

namespace palisade {
namespace {

using testing::HasSubstr;
using testing::Not;

// Invented, and long enough to be taken for what it stands for.
const std::string token = "EAAx7Qk2LmZ0vB9cRt5YpW3sHd8JfN1gUo4KaTe6";

TEST(ATokenInAText, IsMaskedWhereverItStands) {
  struct Case {
    std::string text;
    std::string redacted;
  };
  for (const auto& [text, redacted] : std::vector<Case>{
           {token, "[masked]"},
           {"The token is " + token + ".", "The token is [masked]."},
           {"\"" + token + "\", \"" + token + "\"", "\"[masked]\", \"[masked]\""},
           {"https://example.org/me?access=1&t:" + token + "&limit=5", "https://example.org/me?access=1&t:[masked]&limit=5"},
           {"Bearer\t" + token + "\n", "Bearer\t[masked]\n"},
           {"AAAAAAAAAAAAAAAAAAAAAAAAAAAAAAAA", "[masked]"},
           {"abc-def_0~hij+klm=nop-qrs_tuv~wxy+z", "[masked]"},
       }) {
    EXPECT_EQ(redactedText(text), redacted);
  }
}

TEST(AText, StaysAsItIsWhenNothingInItLooksLikeAToken) {
  for (const std::string& text : std::vector<std::string>{
           "",
           "The user was asked.",
           "user_about_me,publish_stream,friends_relationship_details",
           "friends_actions_and_their_relationship_details",
           "1234567890123456",
           "com.example.an.application.with.a.very.long.identifier.Editor",
           "/usr/share/palisade/clients.d/com.example.editor.toml",
           "7Qk2LmZ0vB9cRt5YpW3sHd8JfN1gUo4",  // 31 characters
           "Zugriff für „Köln-App“ verweigert",
       }) {
    EXPECT_EQ(redactedText(text), text);
  }
}

TEST(AMember, IsMaskedByItsNameWhateverItHolds) {
  for (const std::string name :
       {"access_token", "oauthToken", "TOKEN", "app_secret", "Password", "Authorization", "credentials"}) {
    for (const Value& secret : std::vector<Value>{"short", 17, true, Array{"short"}, Dictionary{{"value", "short"}}}) {
      const Value redacted = redactedValue(Dictionary{{name, secret}, {"id", "100001"}});
      EXPECT_EQ(redacted, Value(Dictionary{{name, masked}, {"id", "100001"}})) << name;
    }
  }
}

TEST(AValue, IsMaskedAtEveryDepth) {
  const Value deep = Dictionary{
      {"data", Array{Dictionary{{"name", "Ada"}, {"access_token", "short"}}, Array{Array{token, "kept"}}}}, {"next", token}};
  EXPECT_EQ(
      redactedValue(deep),
      Value(Dictionary{{"data", Array{Dictionary{{"name", "Ada"}, {"access_token", masked}}, Array{Array{masked, "kept"}}}},
                       {"next", masked}}));
}

TEST(AValue, IsMaskedWhereATokenIsAName) {
  EXPECT_EQ(redactedValue(Dictionary{{token, 1}}), Value(Dictionary{{std::string(masked), 1}}));
}

TEST(AValue, KeepsWhatIsNoText) {
  const Value value = Dictionary{{"count", 12}, {"ratio", 0.5}, {"isMember", false}, {"nobody", nullptr}};
  EXPECT_EQ(redactedValue(value), value);
}

std::string messageOf(std::string_view format, const std::vector<LogArgument>& arguments) {
  return redactedMessage(
      {.place = "test", .level = LogLevel::notice, .format = format, .argumentNames = "", .arguments = arguments});
}

TEST(AMessage, MasksEachArgumentAndKeepsTheRest) {
  const Value answer = Dictionary{{"access_token", "short"}, {"id", "100001"}};
  const Value text = token;
  const std::optional<Error> error = Error{.domain = "org.example", .code = 3, .description = "Refused " + token};
  const std::string message = messageOf("%@ of %@ got %@, %@ and %@.", {std::string_view("Ada"), token, answer, text, error});
  EXPECT_THAT(message, Not(HasSubstr(token)));
  EXPECT_EQ(
      message,
      "Ada of [masked] got {\"access_token\":\"[masked]\",\"id\":\"100001\"}, [masked] and org.example 3: Refused [masked].");
}

TEST(AMessage, MasksKnownSecretsByTheirValueHoweverItIsPutTogether) {
  KnownSecrets::ofProcess().remember("open sesame/user_photos.all");
  EXPECT_EQ(messageOf("got %@.", {std::string_view("open sesame/user_photos.all")}), "got [masked].");
  EXPECT_EQ(messageOf("got %@%@.", {std::string_view("open sesame/"), std::string_view("user_photos.all")}), "got [masked].");
  EXPECT_EQ(messageOf("got %@.", {std::string_view("b3BlbiBzZXNhbWUvdXNlcl9waG90b3MuYWxs")}), "got [masked].");
  const Value answer = Dictionary{{"message", "refused open sesame/user_photos.all"}};
  EXPECT_EQ(messageOf("got %@.", {answer}), R"(got {"message":"refused [masked]"}.)");
}

TEST(AMessage, MasksWhatAnAnswerRepeatsUnderAnotherName) {
  const Value answer = Dictionary{{"access_token", "let/me/in.please"}, {"debug", "issued let/me/in.please"}};
  EXPECT_EQ(messageOf("got %@.", {answer}), R"(got {"access_token":"[masked]","debug":"issued [masked]"}.)");
}

TEST(AMessage, KeepsNumbersAndWhatIsNone) {
  EXPECT_EQ(messageOf("%d of %@", {std::size_t{7}, std::optional<std::string>()}), "7 of (null)");
}

}  // namespace
}  // namespace palisade
