#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <random>
#include <string>

#include "Host/Json/Json.h"

using namespace palisade;

namespace {

// Of characters that no message of ours holds side by side.
const std::string canary = "QZXJQZXJ";

bool betraysCanary(const std::string& description) {
  for (std::size_t start = 0; start + 3 <= canary.size(); ++start) {
    if (description.find(canary.substr(start, 3)) != std::string::npos) return true;
  }
  return false;
}

Error errorOf(std::string_view text) {
  const JsonParseResult result = NlohmannJsonParser().parse(text, JsonFragments::refused);
  return result.error.value_or(Error{});
}

}  // namespace

TEST(AJsonError, NeverQuotesTheText) {
  using namespace std::string_literals;
  const std::string texts[] = {
      canary,
      "\"" + canary + "\"",
      "\"" + canary,
      "[\"" + canary + "\" \"" + canary + "\"]",
      "[" + canary + "]",
      "{" + canary + ":1}",
      "{\"" + canary + "\"}",
      "{\"" + canary + "\" " + canary + "}",
      "{\"" + canary + "\":1,\"" + canary + "\":2}",
      "{\"" + canary + "\":1} " + canary,
      "\"" + canary + "\\" + canary + "\"",
      "\"" + canary + "\\u" + canary + "\"",
      "\"" + canary + "\\ud800" + canary + "\"",
      "\"" + canary + "\n" + canary + "\"",
      "\"" + canary + "\0"s + canary + "\"",
      "\"" + canary + "\xFF" + canary + "\"",
      "[1e" + canary + "]",
      "[tru" + canary + "]",
      "access_token=" + canary + "&expires=0",
  };
  for (const std::string& text : texts) {
    SCOPED_TRACE(text);
    const Error error = errorOf(text);
    ASSERT_NE(error.code, 0);
    EXPECT_FALSE(betraysCanary(error.description.value())) << *error.description;
  }
}

TEST(AJsonError, QuotesNoDigitsOfANumberOutOfRange) {
  EXPECT_EQ(errorOf("[73519735197351e999]").description, "Line 1, column 19: a number is out of range.");
}

TEST(AJsonError, NeverQuotesTheTextHoweverItIsBroken) {
  const std::string whole = R"({"access_token":")" + canary + R"(","list":[1,-2.5e3,true,null,")" + canary + R"(\u00e9"],")" +
                            canary + R"(":{"a":")" + canary + "\"}}";
  const std::string pieces = "\"\\{}[]:,0eu-.tfn \n\x01\xC3\xFF" + std::string(1, '\0');
  std::mt19937 random(20251121);
  int refused = 0;
  for (int round = 0; round < 20'000; ++round) {
    std::string text = whole;
    for (unsigned change = random() % 3 + 1; change > 0; --change) {
      const std::size_t position = random() % text.size();
      const char piece = pieces[random() % pieces.size()];
      if (random() % 3 == 0) {
        text.insert(position, 1, piece);
      } else if (random() % 2 == 0) {
        text[position] = piece;
      } else {
        text.resize(position + 1);
      }
    }
    const Error error = errorOf(text);
    if (error.code == 0) continue;
    ++refused;
    ASSERT_FALSE(betraysCanary(error.description.value())) << text << "\n" << *error.description;
  }
  EXPECT_GT(refused, 10'000);
}

TEST(AJsonError, SaysWhatIsWrong) {
  const std::pair<std::string, std::string> cases[] = {
      {"", "Line 1, column 1: there is no value."},
      {"[1", "Line 1, column 3: the text ends before the value does."},
      {"[\"a", "Line 1, column 4: the text ends inside a string."},
      {"[yes]", "Line 1, column 2: only true, false and null may stand without quotes."},
      {"[1 2]", "Line 1, column 4: a comma or a closing bracket is expected."},
      {"[1,]", "Line 1, column 4: a value is expected."},
      {"{1}", "Line 1, column 2: a name in double quotes is expected."},
      {"{\"a\",1}", "Line 1, column 5: a colon is expected after a name."},
      {"{\"a\":1 \"b\"}", "Line 1, column 10: a comma or a closing brace is expected."},
      {"[] []", "Line 1, column 4: something follows the value."},
      {"[-]", "Line 1, column 3: a number lacks a digit."},
      {"[\"\\q\"]", "Line 1, column 4: a string holds an unknown escape."},
      {"[\"\\uZ\"]", "Line 1, column 5: an escape that begins with \\u needs four hexadecimal digits."},
      {"[\"\\udead\"]", "Line 1, column 8: half of a surrogate pair stands alone in a string."},
      {"[\"\x01\"]", "Line 1, column 3: a control character in a string must be escaped."},
      {"[\"\xFE\"]", "Line 1, column 3: the text is not UTF-8."},
      {"{\"a\":1,\"a\":1}", "Line 1, column 10: an object holds this name already."},
      {"7", "Line 1, column 1: an object or an array is expected."},
      {std::string(40, '['), "Line 1, column 33: arrays and objects are nested too deep."},
  };
  for (const auto& [text, description] : cases) {
    SCOPED_TRACE(text);
    EXPECT_EQ(errorOf(text).description, description);
  }
}
