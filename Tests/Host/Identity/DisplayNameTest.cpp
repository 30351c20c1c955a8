#include "Host/Identity/DisplayName.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <random>
#include <string>
#include <utility>
#include <vector>

namespace palisade {
namespace {

using std::string_literals::operator""s;

TEST(AName, IsShownOnOneLineWithoutWhatNobodySees) {
  const std::vector<std::pair<std::string, std::string>> cases = {
      {"Photos", "Photos"},
      {"Фотографије 写真 תמונות", "Фотографије 写真 תמונות"},
      {"", ""},
      {"  Photos \t of \n Ann  ", "Photos of Ann"},
      {"Photos\r\nGranted by the system", "Photos Granted by the system"},
      {"Photos\u2028wants\u2029nothing", "Photos wants nothing"},
      {"Pho\0tos"s, "Photos"},
      {"Pho\x1b[2Jtos", "Pho[2Jtos"},
      {"\u202ePhotos\u202c \u2066x\u2069 \u200fy\u061c", "Photos x y"},
      {"Pho\u200btos\ufeff\u00ad", "Photos"},
      {"Photos %@ %d", "Photos %@ %d"},
      {"می\u200cخواهم", "می\u200cخواهم"},
      {"\xff\xc3Pho\x80tos\xe2\x82", "Photos"},
      {"\xc0\xafPhotos\xed\xa0\x80", "Photos"},
      {"\u202e\u200b\n", ""},
      {std::string(128, 'x'), std::string(128, 'x')},
      {std::string(129, 'x'), std::string(128, 'x') + "…"},
      {std::string(1000000, 'x'), std::string(128, 'x') + "…"},
  };
  for (const auto& [name, shown] : cases) EXPECT_EQ(displayName(name), shown) << name.substr(0, 200);
}

TEST(AName, CanBeShownAsItIsOnceItWasMadeSo) {
  std::mt19937 random(20240229);
  const std::vector<std::string> pieces = {"a",  " ",      "\n",       "\xff", "\u202e", "é",
                                           "写", "\u2028", "\xe2\x80", "\0"s,  "\x7f",   "\u2069"};
  std::uniform_int_distribution<std::size_t> piece(0, pieces.size() - 1);
  std::uniform_int_distribution<int> length(0, 40);
  for (int turn = 0; turn < 100000; ++turn) {
    std::string name;
    for (int count = length(random); count > 0; --count) name += pieces[piece(random)];
    const std::string shown = displayName(name);
    ASSERT_TRUE(isShownAsItIs(shown));
    ASSERT_EQ(displayName(shown), shown);
    ASSERT_FALSE(shown.starts_with(' ') || shown.ends_with(' '));
  }
}

TEST(APath, IsNotShownAsItIsWhenItHidesSomething) {
  EXPECT_TRUE(isShownAsItIs("/usr/bin/photos"));
  EXPECT_TRUE(isShownAsItIs("/home/jürgen/写真"));
  for (const char* path : {"/tmp/a\nb", "/tmp/\u202eb", "/tmp/\xff", "/tmp/\x1b[0m", "/tmp/\xe2\x82"}) {
    EXPECT_FALSE(isShownAsItIs(path)) << path;
  }
}

}  // namespace
}  // namespace palisade
