#include "Host/Text/PrintableText.h"

#include <gtest/gtest.h>

#include <random>

namespace palisade {
namespace {

struct Case {
  const char* name;
  std::string text, shown, json;
};

class Printable : public testing::TestWithParam<Case> {};

TEST_P(Printable, TextIsHarmless) { EXPECT_EQ(printableText(GetParam().text), GetParam().shown); }

TEST_P(Printable, JsonSaysTheSame) { EXPECT_EQ(printableJson("\"" + GetParam().text + "\""), "\"" + GetParam().json + "\""); }

INSTANTIATE_TEST_SUITE_P(
    Texts, Printable,
    testing::Values(Case{"Plain", "Access to “Photos” 日本語 🙂", "Access to “Photos” 日本語 🙂",
                         "Access to “Photos” 日本語 🙂"},
                    Case{"Joiners", "👩\u200D👧 می\u200Cخواهم", "👩\u200D👧 می\u200Cخواهم", "👩\u200D👧 می\u200Cخواهم"},
                    Case{"Colour", "\x1b[31mred", "\uFFFD[31mred", "\\u001b[31mred"},
                    Case{"Title", "\x1b]0;title\x07", "\uFFFD]0;title\uFFFD", "\\u001b]0;title\\u0007"},
                    Case{"C1", "\u009b2J", "\uFFFD2J", "\\u009b2J"}, Case{"Delete", "a\x7f", "a\uFFFD", "a\\u007f"},
                    Case{"Lines", "a\r\nb\u2028c\u2029d\u0085e", "a\uFFFD\uFFFDb\uFFFDc\uFFFDd\uFFFDe",
                         "a\\u000d\\u000ab\\u2028c\\u2029d\\u0085e"},
                    Case{"Directions", "\u202E\u2066\u2069\u200F\u061C", "\uFFFD\uFFFD\uFFFD\uFFFD\uFFFD",
                         "\\u202e\\u2066\\u2069\\u200f\\u061c"},
                    Case{"Unseen", "a\u200Bb\u00ADc\uFEFF", "a\uFFFDb\uFFFDc\uFFFD", "a\\u200bb\\u00adc\\ufeff"},
                    Case{"Tags", "\U000E0041", "\uFFFD", "\\udb40\\udc41"},
                    Case{"NoText", "a\xC3(\uFFFF", "a\uFFFD(\uFFFD", "a\uFFFD(\uFFFD"}),
    [](const auto& instance) { return instance.param.name; });

TEST(PrintableText, HoldsNoControlWhateverItIsMadeOf) {
  std::mt19937 random(3);
  for (int round = 0; round < 50'000; ++round) {
    std::string text;
    for (unsigned length = random() % 16; text.size() < length;) text += static_cast<char>(random());
    for (const std::string& result : {printableText(text), printableJson(text)}) {
      for (std::size_t place = 0; place < result.size(); ++place) {
        const auto byte = static_cast<unsigned char>(result[place]);
        ASSERT_TRUE(byte >= ' ' && byte != 0x7F) << testing::PrintToString(text);
        if (byte == 0xC2) {
          ASSERT_GE(static_cast<unsigned char>(result[place + 1]), 0xA0U);
        }
      }
    }
  }
}

}  // namespace
}  // namespace palisade
