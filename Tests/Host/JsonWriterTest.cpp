#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <bit>
#include <cmath>
#include <limits>
#include <random>
#include <string>

#include "Host/Json/Json.h"

using namespace palisade;
using testing::Optional;

namespace {

/// Values of every kind, nested a few levels deep, from a fixed seed.
class RandomValues {
 public:
  explicit RandomValues(unsigned seed) : _random(seed) {}

  Value next(unsigned depth = 5) {
    switch (below(depth == 0 ? 7 : 9)) {
      case 0: return nullptr;
      case 1: return below(2) == 0;
      case 2: return static_cast<std::int64_t>(_random());
      case 3: return std::uint64_t{_random()};
      case 4: return static_cast<int>(below(2001)) - 1000;
      case 5: return finiteDouble();
      case 6: return text();
      case 7: return array(depth);
      default: return dictionary(depth);
    }
  }

 private:
  std::uint64_t below(std::uint64_t limit) { return _random() % limit; }

  double finiteDouble() {
    if (below(3) == 0) return static_cast<double>(below(1000)) / 8;
    const auto value = std::bit_cast<double>(_random());
    return std::isfinite(value) ? value : 0.5;
  }

  // Of characters on both sides of every length that UTF-8 has, and of those that JSON escapes.
  std::string text() {
    static constexpr const char* characters[] = {"a",      "Z",      " ",      "\x7F",   "\u0080", "é",          "\u07FF",
                                                 "\u0800", "\u2028", "\uD7FF", "\uE000", "\uFFFF", "\U00010000", "\U0010FFFF",
                                                 "\"",     "\\",     "/",      "\b",     "\n",     "\x01",       "\x1F"};
    std::string result;
    for (std::uint64_t length = below(12); length > 0; --length) result += characters[below(std::size(characters))];
    return result;
  }

  Array array(unsigned depth) {
    Array result;
    for (std::uint64_t count = below(5); count > 0; --count) result.push_back(next(depth - 1));
    return result;
  }

  Dictionary dictionary(unsigned depth) {
    Dictionary result;
    for (std::uint64_t count = below(5); count > 0; --count) result.set(text(), next(depth - 1));
    return result;
  }

  std::mt19937_64 _random;
};

}  // namespace

TEST(WrittenJson, IsCompact) {
  const Value value = Dictionary{{"b", Array{1, -2, 2.5, "x", nullptr, true, Array(), Dictionary()}}, {"a", false}};
  EXPECT_EQ(writeJson(value), R"({"b":[1,-2,2.5,"x",null,true,[],{}],"a":false})");
}

TEST(WrittenJson, KeepsTheKindOfEachNumber) {
  const std::pair<Value, std::string> cases[] = {
      {7, "7"},
      {7.0, "7.0"},
      {-0.0, "-0.0"},
      {0.1, "0.1"},
      {1e300, "1e+300"},
      {std::numeric_limits<std::int64_t>::min(), "-9223372036854775808"},
      {std::numeric_limits<std::uint64_t>::max(), "18446744073709551615"},
      {std::numeric_limits<double>::infinity(), "null"},
      {std::numeric_limits<double>::quiet_NaN(), "null"},
  };
  for (const auto& [value, text] : cases) EXPECT_EQ(writeJson(value), text);
}

TEST(WrittenJson, EscapesWhatMustBeEscaped) {
  EXPECT_EQ(writeJson(std::string("\"\\/\b\f\n\r\t\x01é\0", 12)), R"("\"\\/\b\f\n\r\t\u0001é\u0000")");
}

TEST(WrittenJson, HasAReplacementForWhatIsNotUtf8) {
  EXPECT_EQ(writeJson("a\xFFz"), "\"a\uFFFDz\"");
  EXPECT_EQ(writeJson("\xE2\x82"), "\"\uFFFD\"");
  EXPECT_EQ(writeJson(Dictionary{{"\xC0", Array{"\xED"}}}), "{\"\uFFFD\":[\"\uFFFD\"]}");
}

TEST(WrittenJson, OfTheDeepestValueReadsBack) {
  const std::string text =
      std::string(NlohmannJsonParser::greatestDepth, '[') + std::string(NlohmannJsonParser::greatestDepth, ']');
  const NlohmannJsonParser parser(NlohmannJsonParser::greatestDepth);
  EXPECT_EQ(writeJson(*parser.parse(text, JsonFragments::refused).value), text);
}

TEST(WrittenJson, IsKnownToLoseWhatItLoses) {
  constexpr std::size_t depth = 3;
  const NlohmannJsonParser parser(depth, NullCharacters::refused);
  const Value lost[] = {"\xFF",
                        std::string("a\0b", 3),
                        std::numeric_limits<double>::infinity(),
                        std::nan(""),
                        Dictionary{{"\xC0", 1}},
                        Dictionary{{std::string("\0", 1), 1}},
                        Array{Dictionary{{"name", Array{"\xED"}}}},
                        Array{Array{Array{Array{}}}},
                        Dictionary{{"1", Dictionary{{"2", Dictionary{{"3", Array{}}}}}}}};
  for (const Value& value : lost) {
    SCOPED_TRACE(writeJson(value));
    EXPECT_NE(parser.parse(writeJson(value), JsonFragments::allowed).value, value);
    EXPECT_FALSE(survivesJson(value, depth));
  }
  EXPECT_TRUE(survivesJson(Array{Array{Array{"\u20AC", 0.1, nullptr}}}, depth));
}

TEST(WrittenJson, ReadsBackAsTheSameValueInTheSameOrder) {
  RandomValues values(20251121);
  const NlohmannJsonParser parser;
  for (int round = 0; round < 5'000; ++round) {
    const Value value = values.next();
    const std::string text = writeJson(value);
    const JsonParseResult result = parser.parse(text, JsonFragments::allowed);
    ASSERT_EQ(result.error, std::nullopt) << text;
    ASSERT_THAT(result.value, Optional(value)) << text;
    ASSERT_EQ(writeJson(*result.value), text);
    ASSERT_TRUE(survivesJson(value, 5)) << text;
  }
}
