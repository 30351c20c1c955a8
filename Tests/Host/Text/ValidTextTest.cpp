#include "Host/Text/ValidText.h"

#include <gtest/gtest.h>
#include <sdbus-c++/sdbus-c++.h>

#include <random>

namespace palisade {
namespace {

using namespace std::string_literals;

// As UTF-8 would write it, surrogates and code points beyond Unicode included.
std::string encoded(char32_t code) {
  const auto byte = [](char32_t bits) { return static_cast<char>(static_cast<unsigned char>(bits)); };
  const auto further = [&](int shift) { return byte(0x80 | ((code >> shift) & 0x3F)); };
  if (code < 0x80) return {byte(code)};
  if (code < 0x800) return {byte(0xC0 | (code >> 6)), further(0)};
  if (code < 0x10000) return {byte(0xE0 | (code >> 12)), further(6), further(0)};
  return {byte(0xF0 | (code >> 18)), further(12), further(6), further(0)};
}

bool busSends(const std::string& text) {
  try {
    // A variant is a message that was written already.
    const sdbus::Variant sent(text);
    return true;
  } catch (const sdbus::Error&) {
    return false;
  }
}

TEST(ValidText, IsWhatTheLibraryOfTheBusSendsForEveryCodePoint) {
  for (char32_t code = 1; code < 0x120000; ++code) {
    const std::string text = encoded(code);
    ASSERT_EQ(isValidText(text), busSends(text)) << std::hex << static_cast<std::uint32_t>(code);
  }
}

TEST(ValidText, IsWhatTheLibraryOfTheBusSendsForEveryTwoBytesAndForRandomOnes) {
  const auto agree = [](const std::string& text) { return isValidText(text) == busSends(text); };
  for (int first = 1; first < 256; ++first) {
    for (int second = 1; second < 256; ++second) {
      ASSERT_TRUE(agree({'x', static_cast<char>(first), static_cast<char>(second)})) << first << ' ' << second;
    }
  }
  std::mt19937 random(7);
  // Bytes that begin, continue and end sequences are frequent.
  const std::string bytes = "a\x7F\x80\x8F\x90\x9F\xA0\xB7\xBE\xBF\xC0\xC2\xDF\xE0\xED\xEF\xF0\xF4\xF5\xF8\xFF";
  for (int round = 0; round < 200'000; ++round) {
    std::string text;
    for (unsigned length = random() % 7; text.size() < length;) text += bytes[random() % bytes.size()];
    ASSERT_TRUE(agree(text)) << testing::PrintToString(text);
  }
}

TEST(ValidText, HoldsNoNullCharacter) {
  EXPECT_FALSE(isValidText("a\0b"s));
  EXPECT_EQ(validText("a\0b"s), "a\uFFFDb");
}

TEST(ValidText, IsItselfWhenItIsRepaired) {
  std::string longText(10'000, 'x');
  longText += "é";
  for (const std::string& text : {""s, "plain"s, "Ünïcödé 日本語 🙂"s, "\uFFFD"s, longText}) {
    EXPECT_TRUE(isValidText(text));
    EXPECT_EQ(validText(text), text);
  }
}

TEST(ValidText, HasOneReplacementForEachCharacterThatMayNotStandAndForEachByteOfNone) {
  EXPECT_EQ(validText("a\uFDD0b\uFFFFc"), "a\uFFFDb\uFFFDc");
  EXPECT_EQ(validText("\U0010FFFE\U0001FFFF"), "\uFFFD\uFFFD");
  EXPECT_EQ(validText("\xC3"), "\uFFFD");
  EXPECT_EQ(validText("x\xC3(y"), "x\uFFFD(y");
  EXPECT_EQ(validText("\xED\xA0\x80"), "\uFFFD\uFFFD\uFFFD");
  EXPECT_EQ(validText("\xFF\xFEok"), "\uFFFD\uFFFDok");
}

TEST(ValidText, IsWhatEveryRepairComesTo) {
  std::mt19937 random(11);
  for (int round = 0; round < 100'000; ++round) {
    std::string text;
    for (unsigned length = random() % 12; text.size() < length;) text += static_cast<char>(random());
    ASSERT_TRUE(isValidText(validText(text))) << testing::PrintToString(text);
  }
}

TEST(AShortenedText, IsItselfUpToItsBound) {
  EXPECT_EQ(shortened("", 8), "");
  EXPECT_EQ(shortened("12345678", 8), "12345678");
  EXPECT_EQ(shortened("123456789", 8), "12345…");
}

TEST(AShortenedText, CutsNoCharacterAndKeepsItsBound) {
  const std::string text = "aé日🙂aé日🙂aé日🙂";
  for (std::size_t most = 3; most < text.size(); ++most) {
    const std::string cut = shortened(text, most);
    EXPECT_LE(cut.size(), most);
    EXPECT_TRUE(isValidText(cut));
    EXPECT_TRUE(cut.ends_with("…"));
  }
}

}  // namespace
}  // namespace palisade
