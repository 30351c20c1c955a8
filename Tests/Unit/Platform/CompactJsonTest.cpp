// Values as compact JSON: what stands in a log and in an error's description for everything that is no string.

#include <gmock/gmock.h>

#include <cmath>
#include <cstdint>
#include <limits>
#include <random>

#include "Host/Json/Json.h"
#include "Platform/Format.h"

namespace palisade {
namespace {

TEST(CompactJson, WritesEveryKindOfValue) {
  const std::pair<Value, const char*> cases[] = {
      {nullptr, "null"},
      {true, "true"},
      {false, "false"},
      {0, "0"},
      {-1, "-1"},
      {"", R"("")"},
      {"email", R"("email")"},
      {Array(), "[]"},
      {Array{1}, "[1]"},
      {Array{1, "two", nullptr, Array{Array()}}, R"([1,"two",null,[[]]])"},
      {Array{1, 1, 1}, "[1,1,1]"},
      {Dictionary(), "{}"},
      {Dictionary{{"a", 1}}, R"({"a":1})"},
      {Dictionary{{"z", Array{true}}, {"a", Dictionary{{"\"", false}}}}, R"({"z":[true],"a":{"\"":false}})"},
  };
  for (const auto& [value, json] : cases) EXPECT_EQ(compactJson(value), json);
}

TEST(CompactJson, EscapesWhatAStringMayNotHold) {
  const std::pair<std::string, const char*> cases[] = {
      {"\"quoted\"", R"("\"quoted\"")"},
      {"back\\slash", R"("back\\slash")"},
      {"\b\f\n\r\t", R"("\b\f\n\r\t")"},
      {std::string("\0", 1), R"("\u0000")"},
      {"\x01\x0b\x1f", R"("\u0001\u000b\u001f")"},
      {"\x20\x7f/", "\"\x20\x7f/\""},
      {"ä € 😀", R"("ä € 😀")"},
  };
  for (const auto& [text, json] : cases) EXPECT_EQ(compactJson(text), json);
}

TEST(CompactJson, KeepsEveryDigitOfAWholeNumber) {
  const std::pair<Value, const char*> cases[] = {
      {INT64_MIN, "-9223372036854775808"},
      {INT64_MAX, "9223372036854775807"},
      {std::uint64_t{1} << 63, "9223372036854775808"},
      {UINT64_MAX, "18446744073709551615"},
  };
  for (const auto& [value, json] : cases) EXPECT_EQ(compactJson(value), json);
}

TEST(CompactJson, WritesDoublesSoThatTheyStayDoubles) {
  constexpr double infinity = std::numeric_limits<double>::infinity();
  const std::pair<double, const char*> cases[] = {
      {0.0, "0.0"},
      {-0.0, "-0.0"},
      {1.0, "1.0"},
      {-1.0, "-1.0"},
      {0.1, "0.1"},
      {2.5, "2.5"},
      {0.0001, "0.0001"},
      {0.00001, "1e-05"},
      {1e15, "1000000000000000.0"},
      {1e16, "1e+16"},
      {-1.5e300, "-1.5e+300"},
      {0.30000000000000004, "0.30000000000000004"},
      {std::numeric_limits<double>::denorm_min(), "5e-324"},
      {std::numeric_limits<double>::max(), "1.7976931348623157e+308"},
      {infinity, "null"},
      {-infinity, "null"},
      {std::nan(""), "null"},
  };
  for (const auto& [number, json] : cases) EXPECT_EQ(compactJson(number), json);
}

// Values of every kind, nested up to `depth` deep.
class RandomValues {
 public:
  explicit RandomValues(unsigned seed) : _random(seed) {}

  Value next(int depth) {
    switch (below(depth > 0 ? 8 : 6)) {
      case 0: return nullptr;
      case 1: return below(2) == 0;
      case 2: return static_cast<std::int64_t>(_random());
      case 3: return (std::uint64_t{1} << 63) + _random() / 2;
      case 4: return std::ldexp(static_cast<double>(_random()), static_cast<int>(below(400)) - 200);
      case 5: return text();
      case 6: {
        Array array;
        for (auto count = below(5); count > 0; --count) array.push_back(next(depth - 1));
        return array;
      }
      default: {
        Dictionary dictionary;
        for (auto count = below(5); count > 0; --count) dictionary.set(text(), next(depth - 1));
        return dictionary;
      }
    }
  }

 private:
  std::uint64_t below(std::uint64_t bound) { return _random() % bound; }

  // The parser accepts no U+0000; everything else may stand in a string.
  std::string text() {
    static constexpr std::string_view pieces[] = {"a", "\"", "\\", "\n", "\x01", "\x1f", "%@", "ä", "€", "😀", "/", "\x7f"};
    std::string text;
    for (auto count = below(8); count > 0; --count) text += pieces[below(std::size(pieces))];
    return text;
  }

  std::mt19937_64 _random;
};

TEST(CompactJson, ReadsBackAsTheValueThatItWasWrittenFrom) {
  const NlohmannJsonParser parser;
  RandomValues values(20250101);
  for (int round = 0; round < 2000; ++round) {
    const Value value = values.next(4);
    const std::string json = compactJson(value);
    const JsonParseResult parsed = parser.parse(json, JsonFragments::allowed);
    ASSERT_TRUE(parsed.value.has_value()) << json << " " << parsed.error->description.value_or("");
    ASSERT_EQ(*parsed.value, value) << json;
  }
}

}  // namespace
}  // namespace palisade
