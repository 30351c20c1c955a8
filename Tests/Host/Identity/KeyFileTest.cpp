#include "Host/Identity/KeyFile.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace palisade {
namespace {

using std::string_literals::operator""s;

TEST(AKeyFile, HoldsValuesByGroupAndKey) {
  const KeyFile expected = {{"One", {{"key", "value"}, {"key[de]", "Wert"}, {"empty", ""}}}, {"Two", {{"key", "a=b"}}}};
  EXPECT_EQ(keyFileFromText("# comment\n\n[One]\nkey=value\nkey[de] = Wert \r\nempty=\n[Two]\n  key=a=b"), expected);
}

TEST(AKeyFile, RestoresEscapedCharactersAndKeepsOtherSequences) {
  EXPECT_EQ(keyFileFromText("[G]\nk=\\sa\\nb\\tc\\rd\\\\e\\;f\\").value().at("G").at("k"), " a\nb\tc\rd\\e\\;f\\");
}

TEST(AKeyFile, IsNoneWhenALineIsWrong) {
  const std::vector<std::string> texts = {
      "key=value\n",     "[G]\nkey\n",   "[G]\n=value\n", "[G\nkey=value\n", "[]\n",           "[G]]\n", "[G]\n[G]\n",
      "[G]\nk=1\nk=2\n", "[G]\nk=\0\n"s, "\0"s,           "\xff\xfe[G]\n",   "[G] trailing\n", "["};
  for (const std::string& text : texts) EXPECT_EQ(keyFileFromText(text), std::nullopt) << text;
}

TEST(AKeyFile, MayBeEmpty) { EXPECT_EQ(keyFileFromText(""), KeyFile()); }

}  // namespace
}  // namespace palisade
