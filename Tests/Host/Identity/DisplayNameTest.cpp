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
      {"Photos\u00a0\u2003\u3000\u2800\u3164 of Ann", "Photos of Ann"},
      {std::string(40, 'x'), std::string(40, 'x')},
      {std::string(41, 'x'), std::string(39, 'x') + "…"},
      {std::string(1000000, 'x'), std::string(39, 'x') + "…"},
      {std::string(38, 'x') + " yz", std::string(38, 'x') + "…"},
  };
  for (const auto& [name, shown] : cases) EXPECT_EQ(displayName(name), shown) << name.substr(0, 200);
}

std::string times(std::string_view text, int count) {
  std::string result;
  for (; count > 0; --count) result += text;
  return result;
}

TEST(AName, StaysBetweenItsQuotationMarks) {
  const std::vector<std::pair<std::string, std::string>> cases = {
      {"Photos” is safe. “Mail", "Photos· is safe. ·Mail"},
      {"Photos » est sûr. « Mail", "Photos · est sûr. · Mail"},
      {"写真」は「メール", "写真·は·メール"},
      {"사진’ 앱", "사진· 앱"},
      {"Ada's Photos", "Adaˈs Photos"},
      {"L’Album d`Ada", "LˈAlbum dˈAda"},
      {"Rock 'n' Roll", "Rock ·n· Roll"},
      {"''Photos''", "··Photos··"},
      {"\u0301\u20e0Photos", "Photos"},
      {"\u0600Photos\u06dd", "\u0600Photos"},
      {"Photos \u0301", "Photos \u0301"},
      {"Photos\u200d", "Photos\u200d"},
  };
  for (const auto& [name, shown] : cases) {
    EXPECT_EQ(displayName(name), shown);
    EXPECT_EQ(displayName(shown), shown);
  }
}

TEST(AName, IsCutBetweenWhatPeopleTakeForCharacters) {
  EXPECT_EQ(displayName(times("写", 30)), times("写", 19) + "…") << "each takes two columns";
  EXPECT_EQ(displayName(times("e\u0301", 50)), times("e\u0301", 39) + "…");
  EXPECT_EQ(displayName(times("x", 38) + "👩\u200d🚀" + times("x", 38)), times("x", 38) + "…");
  EXPECT_EQ(displayName("o" + times("\u0301", 1000)), "o" + times("\u0301", 4)) << "marks do not pile up over other lines";
}

TEST(AProgram, IsCalledByItsPathWhichKeepsBothEnds) {
  EXPECT_EQ(displayNameOfProgram("/usr/bin/photos"), "/usr/bin/photos");
  EXPECT_EQ(displayNameOfProgram("/home/ada/a/very/long/path/to/nowhere/in/particular/photos"),
            "/home/ada/a/v…where/in/particular/photos");
  EXPECT_EQ(displayNameOfProgram("/tmp/Photos” is safe"), "/tmp/Photos· is safe");
  const std::string shown = displayNameOfProgram("/home/ada/" + times("写真", 50) + "/photos");
  EXPECT_EQ(displayName(shown), shown);
}

TEST(AnIdentifier, KeepsBothEnds) {
  EXPECT_EQ(displayIdentifier("org.example.photos"), "org.example.photos");
  EXPECT_EQ(displayIdentifier("/home/ada's/photos”"), "/home/ada's/photos”");
  EXPECT_EQ(displayIdentifier("org." + std::string(200, 'x') + ".photos"),
            "org." + std::string(35, 'x') + "…" + std::string(73, 'x') + ".photos");
}

TEST(AName, CanBeShownAsItIsOnceItWasMadeSo) {
  std::mt19937 random(20240229);
  const std::vector<std::string> pieces = {"a",      " ",        "\n",  "\xff",   "\u202e", "é", "写",
                                           "\u2028", "\xe2\x80", "\0"s, "\x7f",   "\u2069", "”", "'",
                                           "\u0301", "\u200d",   "👩",   "\u0600", "\u3164", "·", "…"};
  std::uniform_int_distribution<std::size_t> piece(0, pieces.size() - 1);
  std::uniform_int_distribution<int> length(0, 60);
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
