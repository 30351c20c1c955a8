// What a server may send instead of a description: every kind of JSON, no JSON, too much of it.

#include <gmock/gmock.h>

#include "Tests/Unit/Consent/ConsentScene.h"

namespace palisade {
namespace {

using namespace std::string_literals;

using ::testing::Optional;
using ::testing::SizeIs;
using ::testing::StartsWith;

class ABodyThatIsNoDescription : public ::testing::Test, protected ConsentScene {
 protected:
  // The argument of the one record that says why the body was of no use.
  std::string reasonFor(const std::string& body) {
    serverDescribes(body);
    platform.trace.clear();
    EXPECT_EQ(fetchDescription(permissionSet({"a"})), std::nullopt) << body.substr(0, 100);
    const std::vector<LogLine> lines = logLines(platform.trace);
    EXPECT_THAT(lines, SizeIs(1));
    if (lines.size() != 1) return "";
    EXPECT_EQ(lines[0], (LogLine{.level = 3,
                                 .operation = "_fetchDescriptionForUnknownPermissions:audience:account:",
                                 .format = "Could not parse server response: %@.",
                                 .arguments = lines[0].arguments,
                                 .argumentNames = "error"}));
    EXPECT_THAT(lines[0].arguments, SizeIs(1));
    return lines[0].arguments.at(0);
  }
};

TEST_F(ABodyThatIsNoDescription, MayBeAnyOtherKindOfJsonAndIsNoParseError) {
  for (const char* body : {"{}", R"({"description": "new things"})", "[]", R"(["new things"])", "null", "true", "false", "0",
                           "1.5", "18446744073709551615", " \n{}\n "}) {
    EXPECT_EQ(reasonFor(body), "(null)") << body;
  }
}

TEST_F(ABodyThatIsNoDescription, MayBeNoJsonAndTheParserSaysWhy) {
  const std::string bodies[] = {
      "",
      " ",
      "new things",
      R"("new things)",
      R"("new things" x)",
      R"("a" "b")",
      "'new things'",
      R"("\x")",
      R"("\ud800")",
      "\"line\nbreak\"",
      "\"nul\0inside\""s,
      "\"\xff\xfe\"",
      "\"\xc0\xaf\"",
      "1e400",
      R"({"a": 1, "a": 2})",
      "<html>",
  };
  for (const std::string& body : bodies) EXPECT_THAT(reasonFor(body), StartsWith("JsonErrorDomain ")) << body;
}

TEST_F(ABodyThatIsNoDescription, MayBeNestedAHundredThousandDeep) {
  constexpr std::size_t depth = 100'000;
  EXPECT_THAT(reasonFor(std::string(depth, '[') + std::string(depth, ']')), StartsWith("JsonErrorDomain "));
  EXPECT_THAT(reasonFor(std::string(depth, '[')), StartsWith("JsonErrorDomain "));

  std::string objects;
  for (std::size_t level = 0; level < depth; ++level) objects += R"({"a":)";
  EXPECT_THAT(reasonFor(objects), StartsWith("JsonErrorDomain "));
}

class ADescriptionOfAnyText : public ::testing::Test, protected ConsentScene {};

TEST_F(ADescriptionOfAnyText, IsTakenAsItStands) {
  const std::pair<const char*, std::string> cases[] = {
      {R"("line\nbreak")", "line\nbreak"},
      {R"("\"quoted\"")", "\"quoted\""},
      {R"("\u00e4\ud83d\ude00")", "ä😀"},
      {R"(" blanks ")", " blanks "},
      {"\xEF\xBB\xBF\"after a mark\"", "after a mark"},
      {R"(  "padded"  )", "padded"},
      {R"("null")", "null"},
      {R"("nul\u0000inside")", "nul\0inside"s},
  };
  for (const auto& [body, description] : cases) {
    serverDescribes(body);
    EXPECT_THAT(fetchDescription(permissionSet({"a"})), Optional(description));
  }
}

TEST_F(ADescriptionOfAnyText, MayBeAMegabyteLong) {
  const std::string megabyte(1 << 20, 'x');
  serverDescribes('"' + megabyte + '"');

  EXPECT_THAT(message({"new_thing"}), Optional(shown("ACCOUNT_ACCESS_UNKNOWN_FORMAT", {"Photos", megabyte})));
}

}  // namespace
}  // namespace palisade
