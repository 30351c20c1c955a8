#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <limits>
#include <string>

#include "Host/Json/Json.h"

using namespace palisade;
using testing::Optional;
using testing::StartsWith;

namespace {

std::string nested(std::size_t depth) { return std::string(depth, '[') + std::string(depth, ']'); }

std::string nestedObjects(std::size_t depth) {
  std::string text;
  for (std::size_t level = 0; level < depth; ++level) text += R"({"a":)";
  return text + "1" + std::string(depth, '}');
}

int codeOf(const JsonParseResult& result) { return result.error ? result.error->code : 0; }

JsonParseResult parse(std::string_view text) { return NlohmannJsonParser().parse(text, JsonFragments::allowed); }

}  // namespace

TEST(TheJsonParser, AcceptsEveryKindOfValue) {
  const struct {
    std::string text;
    Value value;
  } cases[] = {
      {"null", nullptr},
      {"true", true},
      {"false", false},
      {"0", 0},
      {"-0", 0},
      {"-0.0", -0.0},
      {"42", 42},
      {" \t\r\n 42 \n", 42},
      {"9223372036854775807", std::numeric_limits<std::int64_t>::max()},
      {"-9223372036854775808", std::numeric_limits<std::int64_t>::min()},
      {"9223372036854775808", std::uint64_t{9223372036854775808U}},
      {"18446744073709551615", std::numeric_limits<std::uint64_t>::max()},
      {"1.5", 1.5},
      {"1.0", 1.0},
      {"1e2", 100.0},
      {"1e-400", 0.0},
      {"5e-324", std::numeric_limits<double>::denorm_min()},
      {"\"\"", ""},
      {R"("a\"\\\/\b\f\n\r\t\u00e9\u20ac")", "a\"\\/\b\f\n\r\té€"},
      {R"("\ud83d\ude00")", "\U0001F600"},
      {"\"\u00e9\u20ac\U0001F600\"", "é€\U0001F600"},
      {"\xEF\xBB\xBF{}", Dictionary()},
      {"[]", Array()},
      {"{}", Dictionary()},
      {R"([1, "a", [true], {"b": null}])", Array{1, "a", Array{true}, Dictionary{{"b", nullptr}}}},
      {R"({"": 1, "A": 2, "a": {"A": 3}})", Dictionary{{"", 1}, {"A", 2}, {"a", Dictionary{{"A", 3}}}}},
  };
  for (const auto& [text, value] : cases) {
    SCOPED_TRACE(text);
    const JsonParseResult result = parse(text);
    EXPECT_EQ(result.error, std::nullopt);
    EXPECT_THAT(result.value, Optional(value));
  }
}

TEST(TheJsonParser, TellsWholeNumbersFromOthers) {
  EXPECT_NE(parse("7").value->integer(), nullptr);
  EXPECT_NE(parse("7.0").value->real(), nullptr);
  EXPECT_NE(parse("7e0").value->real(), nullptr);
  EXPECT_NE(parse("9223372036854775808").value->largeInteger(), nullptr);
}

TEST(AWholeNumberBeyond64Bits, BecomesTheNearestDouble) {
  EXPECT_THAT(parse("18446744073709551616").value, Optional(Value(18446744073709551616.0)));
  EXPECT_THAT(parse("-9223372036854775809").value, Optional(Value(-9223372036854775808.0)));
  EXPECT_THAT(parse(std::string("1").append(300, '0')).value, Optional(Value(1e300)));
}

TEST(TheJsonParser, KeepsTheOrderOfMembers) {
  const JsonParseResult result = parse(R"({"z":1,"a":2,"m":3,"b":4})");
  std::string names;
  for (const auto& [name, value] : *result.value->dictionary()) names += name;
  EXPECT_EQ(names, "zamb");
}

TEST(TheJsonParser, ReadsALongString) {
  const std::string longText(1 << 20, 'x');
  EXPECT_THAT(parse('"' + longText + '"').value, Optional(Value(longText)));
}

TEST(TheJsonParser, RefusesWithTheCodeAndThePlace) {
  using namespace std::string_literals;
  const struct {
    std::string text;
    JsonErrorCode code;
    std::size_t line, column;
  } cases[] = {
      {"", JsonErrorEmpty, 1, 1},
      {" \n\t ", JsonErrorEmpty, 2, 3},
      {"\xEF\xBB\xBF", JsonErrorEmpty, 1, 1},
      {"nul", JsonErrorMalformed, 1, 4},
      {"True", JsonErrorMalformed, 1, 1},
      {"NaN", JsonErrorMalformed, 1, 1},
      {"Infinity", JsonErrorMalformed, 1, 1},
      {"'a'", JsonErrorMalformed, 1, 1},
      {"[1,2,,3]", JsonErrorMalformed, 1, 6},
      {"[1,]", JsonErrorMalformed, 1, 4},
      {"[1 2]", JsonErrorMalformed, 1, 4},
      {"[1}", JsonErrorMalformed, 1, 3},
      {"[1", JsonErrorMalformed, 1, 3},
      {"]", JsonErrorMalformed, 1, 1},
      {"{\"a\":1,}", JsonErrorMalformed, 1, 8},
      {"{\"a\" 1}", JsonErrorMalformed, 1, 6},
      {"{\"a\":}", JsonErrorMalformed, 1, 6},
      {"{a:1}", JsonErrorMalformed, 1, 2},
      {"{1:1}", JsonErrorMalformed, 1, 2},
      {"[1] [2]", JsonErrorMalformed, 1, 5},
      {"1 x", JsonErrorMalformed, 1, 3},
      {"\n\n  [1,\n  oops]", JsonErrorMalformed, 4, 3},
      {"[\"é€\", x]", JsonErrorMalformed, 1, 8},
      {"01", JsonErrorMalformed, 1, 2},
      {"-", JsonErrorMalformed, 1, 2},
      {"1.", JsonErrorMalformed, 1, 3},
      {"1e", JsonErrorMalformed, 1, 3},
      {"+1", JsonErrorMalformed, 1, 1},
      {".5", JsonErrorMalformed, 1, 1},
      {"0x10", JsonErrorMalformed, 1, 2},
      {"// a comment\n1", JsonErrorMalformed, 1, 1},
      {"\"a", JsonErrorMalformed, 1, 3},
      {"\"\t\"", JsonErrorMalformed, 1, 2},
      {R"("\x41")", JsonErrorMalformed, 1, 3},
      {R"("\u12")", JsonErrorMalformed, 1, 6},
      {R"("\ud800")", JsonErrorMalformed, 1, 8},
      {R"("\ud800\u0041")", JsonErrorMalformed, 1, 13},
      {R"("\udc00")", JsonErrorMalformed, 1, 7},
      {"\xEF\xBB", JsonErrorNotUtf8, 1, 1},
      {"\"a\xFF\"", JsonErrorNotUtf8, 1, 3},
      {"\"\xC0\x80\"", JsonErrorNotUtf8, 1, 2},
      {"\"\xED\xA0\x80\"", JsonErrorNotUtf8, 1, 2},
      {"\"\xF4\x90\x80\x80\"", JsonErrorNotUtf8, 1, 2},
      {"\"\xE2\x82\"", JsonErrorNotUtf8, 1, 2},
      {"\"\xE2\x82", JsonErrorNotUtf8, 1, 2},
      {"[1]\n\x80", JsonErrorNotUtf8, 2, 1},
      {"\xFF\xFE[\0]\0"s, JsonErrorNotUtf8, 1, 1},
      {"\"a\0b\""s, JsonErrorNullCharacter, 1, 3},
      {"[1]\0garbage"s, JsonErrorNullCharacter, 1, 4},
      {"[1]\0"s, JsonErrorNullCharacter, 1, 4},
      {R"({"a":1,"b":2,"a":3})", JsonErrorDuplicateName, 1, 16},
      {R"({"a":1,"\u0061":3})", JsonErrorDuplicateName, 1, 15},
      {R"({"a":{"":1,"":1}})", JsonErrorDuplicateName, 1, 13},
      {"[[{\"b\":[\n{\"c\":0,\"c\":0}]}]]", JsonErrorDuplicateName, 2, 10},
      {"1e400", JsonErrorNumberOutOfRange, 1, 5},
      {"[-1e999]", JsonErrorNumberOutOfRange, 1, 7},
      {std::string(400, '9'), JsonErrorNumberOutOfRange, 1, 400},
      {nested(33), JsonErrorTooDeep, 1, 33},
      {nestedObjects(33), JsonErrorTooDeep, 1, 32 * 5 + 1},
      {std::string(1'000'000, '['), JsonErrorTooDeep, 1, 33},
  };
  for (const auto& [text, code, line, column] : cases) {
    SCOPED_TRACE(text.substr(0, 100));
    const JsonParseResult result = parse(text);
    EXPECT_EQ(result.value, std::nullopt);
    ASSERT_NE(result.error, std::nullopt);
    EXPECT_EQ(result.error->domain, JsonErrorDomain);
    EXPECT_EQ(result.error->code, code);
    EXPECT_THAT(result.error->description,
                Optional(StartsWith("Line " + std::to_string(line) + ", column " + std::to_string(column) + ": ")));
  }
}

TEST(ALimitOfDepth, AcceptsWhatReachesItAndRefusesWhatExceedsIt) {
  for (const std::size_t limit : {std::size_t{1}, std::size_t{2}, std::size_t{32}, NlohmannJsonParser::greatestDepth}) {
    SCOPED_TRACE(limit);
    const NlohmannJsonParser parser(limit);
    EXPECT_EQ(codeOf(parser.parse(nested(limit), JsonFragments::refused)), 0);
    EXPECT_EQ(codeOf(parser.parse(nestedObjects(limit), JsonFragments::refused)), 0);
    EXPECT_EQ(codeOf(parser.parse(nested(limit + 1), JsonFragments::refused)), JsonErrorTooDeep);
    EXPECT_EQ(codeOf(parser.parse(nestedObjects(limit + 1), JsonFragments::refused)), JsonErrorTooDeep);
  }
}

TEST(ALimitOfDepth, CountsWhatIsOpenAndNotWhatWasClosed) {
  EXPECT_EQ(codeOf(NlohmannJsonParser(2).parse("[[],[],{},[1]]", JsonFragments::refused)), 0);
}

TEST(ALimitOfDepth, IsNeverGreaterThanTheStackBears) {
  const NlohmannJsonParser parser(std::numeric_limits<std::size_t>::max());
  EXPECT_EQ(codeOf(parser.parse(nested(NlohmannJsonParser::greatestDepth + 1), JsonFragments::refused)), JsonErrorTooDeep);
  EXPECT_EQ(codeOf(parser.parse(std::string(1'000'000, '['), JsonFragments::refused)), JsonErrorTooDeep);
}

TEST(ALimitOfDepth, OfZeroLeavesBareValues) {
  EXPECT_THAT(NlohmannJsonParser(0).parse("7", JsonFragments::allowed).value, Optional(Value(7)));
  EXPECT_EQ(codeOf(NlohmannJsonParser(0).parse("[]", JsonFragments::allowed)), JsonErrorTooDeep);
}

TEST(ABareValue, IsRefusedWhereFragmentsAre) {
  const NlohmannJsonParser parser;
  for (const char* text : {"null", "true", "7", "1.5", "\"text\"", " 7 "}) {
    SCOPED_TRACE(text);
    const JsonParseResult result = parser.parse(text, JsonFragments::refused);
    EXPECT_EQ(codeOf(result), JsonErrorFragment);
    EXPECT_EQ(result.value, std::nullopt);
  }
  for (const char* text : {"[7]", "{\"a\":7}", "\xEF\xBB\xBF[]"}) {
    SCOPED_TRACE(text);
    EXPECT_EQ(codeOf(parser.parse(text, JsonFragments::refused)), 0);
  }
}

TEST(AnEscapedNullCharacter, IsKeptInStringsAndNamesLikeAnyOther) {
  const auto parsed = parse(R"({"a\u0000b": "\u0000"})");
  ASSERT_TRUE(parsed.value);
  const Value* entry = parsed.value->dictionary()->find(std::string_view("a\0b", 3));
  ASSERT_NE(entry, nullptr);
  EXPECT_EQ(*entry, Value(std::string(1, '\0')));
}

TEST(AnEscapedNullCharacter, IsRefusedWhereItMayNotStand) {
  const NlohmannJsonParser parser(32, NullCharacters::refused);
  const std::pair<const char*, std::size_t> cases[] = {{R"("a\u0000b")", 10}, {R"({"\u0000":1})", 9}};
  for (const auto& [text, column] : cases) {
    const JsonParseResult result = parser.parse(text, JsonFragments::allowed);
    EXPECT_EQ(result.value, std::nullopt);
    ASSERT_EQ(codeOf(result), JsonErrorNullCharacter);
    EXPECT_THAT(result.error->description, Optional(StartsWith("Line 1, column " + std::to_string(column) + ": ")));
  }
}
