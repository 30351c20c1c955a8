#include "Host/Text/QuotableText.h"

#include <unictype.h>
#include <unigbrk.h>
#include <unistr.h>
#include <uniwidth.h>

#include <algorithm>
#include <array>
#include <cstdint>
#include <string>
#include <vector>

namespace palisade {
namespace {

constexpr const char* encoding = "UTF-8";
constexpr std::string_view ellipsis = "…";
constexpr char32_t dot = U'·';
// Looks like an apostrophe, and no language quotes with it.
constexpr char32_t stroke = U'\u02C8';
constexpr std::size_t mostWithoutColumns = 4;

struct Range {
  char32_t first, last;
};

// Single marks stand for the apostrophe, too.
constexpr std::array<Range, 12> singleMarks = {{{0x27, 0x27},
                                                {0x60, 0x60},
                                                {0xB4, 0xB4},
                                                {0x2B9, 0x2B9},
                                                {0x2BB, 0x2BD},
                                                {0x2C8, 0x2C8},
                                                {0x2CA, 0x2CB},
                                                {0x5F3, 0x5F3},
                                                {0x2018, 0x201B},
                                                {0x2032, 0x2032},
                                                {0x2035, 0x2035},
                                                {0xFF07, 0xFF07}}};
constexpr std::array<Range, 24> otherMarks = {
    {{0x22, 0x22},     {0xAB, 0xAB},     {0xBB, 0xBB},     {0x2BA, 0x2BA},   {0x2DD, 0x2DD},   {0x2EE, 0x2EE},
     {0x2F5, 0x2F6},   {0x5F4, 0x5F4},   {0x201C, 0x201F}, {0x2033, 0x2034}, {0x2036, 0x2037}, {0x2039, 0x203A},
     {0x2057, 0x2057}, {0x226A, 0x226B}, {0x275B, 0x2760}, {0x276E, 0x276F}, {0x27EA, 0x27EB}, {0x2E42, 0x2E42},
     {0x3003, 0x3003}, {0x3008, 0x300F}, {0x301D, 0x301F}, {0xFE41, 0xFE44}, {0xFF02, 0xFF02}, {0xFF62, 0xFF63}}};

template <typename Ranges>
bool isIn(const Ranges& ranges, char32_t character) {
  return std::ranges::any_of(ranges, [&](const Range& range) { return character >= range.first && character <= range.last; });
}

bool isSingleMark(char32_t character) { return isIn(singleMarks, character); }

// The ellipsis stands for what was cut off.
bool isOfWord(char32_t character) { return (uc_is_alnum(character) && !isQuotationMark(character)) || character == U'…'; }

const std::uint8_t* bytesOf(std::string_view text) { return reinterpret_cast<const std::uint8_t*>(text.data()); }

std::u32string decoded(std::string_view text) {
  std::u32string characters;
  while (!text.empty()) {
    ucs4_t character = 0;
    const int length = u8_mbtouc(&character, bytesOf(text), text.size());
    characters += static_cast<char32_t>(character);
    text.remove_prefix(static_cast<std::size_t>(std::max(length, 1)));
  }
  return characters;
}

std::string encoded(std::u32string_view characters) {
  std::string text;
  for (const char32_t character : characters) {
    std::array<std::uint8_t, 6> bytes{};
    const int length = u8_uctomb(bytes.data(), character, bytes.size());
    if (length > 0) text.append(bytes.begin(), bytes.begin() + length);
  }
  return text;
}

std::u32string withoutMarks(const std::u32string& characters) {
  std::u32string result = characters;
  for (std::size_t place = 0; place < characters.size(); ++place) {
    if (!isQuotationMark(characters[place])) continue;
    const bool isWithinWord =
        place > 0 && isOfWord(characters[place - 1]) && place + 1 < characters.size() && isOfWord(characters[place + 1]);
    result[place] = isWithinWord && isSingleMark(characters[place]) ? stroke : dot;
  }
  return result;
}

// A mark that combines, a joiner and their like.
bool hasNoColumn(char32_t character) { return uc_width(character, encoding) <= 0; }

std::u32string withFewOfNoColumn(const std::u32string& characters) {
  std::u32string result;
  std::size_t inARow = 0;
  for (const char32_t character : characters) {
    inARow = hasNoColumn(character) ? inARow + 1 : 0;
    if (inARow <= mostWithoutColumns) result += character;
  }
  return result;
}

// Neither what comes before the text nor what comes behind it becomes one character with its ends.
std::u32string_view apart(std::u32string_view characters) {
  constexpr char32_t neighbour = U'“';
  while (!characters.empty() && (characters.front() == ' ' || !uc_is_grapheme_break(neighbour, characters.front()))) {
    characters.remove_prefix(1);
  }
  while (!characters.empty() && (characters.back() == ' ' || !uc_is_grapheme_break(characters.back(), neighbour))) {
    characters.remove_suffix(1);
  }
  return characters;
}

std::size_t columnsOfText(std::string_view text) {
  return static_cast<std::size_t>(std::max(0, u8_width(bytesOf(text), text.size(), encoding)));
}

std::vector<std::string_view> clustersOf(std::string_view text) {
  std::string begins(text.size(), 0);
  u8_grapheme_breaks(bytesOf(text), text.size(), begins.data());
  std::vector<std::string_view> clusters;
  for (std::size_t begin = 0; begin < text.size();) {
    std::size_t end = begin + 1;
    while (end < text.size() && begins[end] == 0) ++end;
    clusters.push_back(text.substr(begin, end - begin));
    begin = end;
  }
  return clusters;
}

// As many of the clusters as fit, one after another.
template <typename Clusters>
std::vector<std::string_view> fitting(const Clusters& clusters, std::size_t columns) {
  std::vector<std::string_view> kept;
  std::size_t used = 0;
  for (const std::string_view cluster : clusters) {
    used += columnsOfText(cluster);
    if (used > columns) break;
    kept.push_back(cluster);
  }
  return kept;
}

template <typename Clusters>
std::string joined(const Clusters& clusters) {
  std::string text;
  for (const std::string_view cluster : clusters) text += cluster;
  return text;
}

std::string withoutBlankAtItsEnd(std::string text) {
  while (text.ends_with(' ')) text.pop_back();
  return text;
}

}  // namespace

bool isQuotationMark(char32_t character) { return isSingleMark(character) || isIn(otherMarks, character); }

std::string quotable(std::string_view text) { return encoded(apart(withFewOfNoColumn(withoutMarks(decoded(text))))); }

std::string fitted(std::string_view text, std::size_t columns) {
  if (columnsOfText(text) <= columns) return std::string(text);
  return withoutBlankAtItsEnd(joined(fitting(clustersOf(text), columns - 1))).append(ellipsis);
}

std::string fittedInItsMiddle(std::string_view text, std::size_t columns) {
  if (columnsOfText(text) <= columns) return std::string(text);
  const std::vector<std::string_view> clusters = clustersOf(text);
  // The end says more: a program's name, the last part of an identifier.
  const std::size_t ofBeginning = (columns - 1) / 3;
  std::vector<std::string_view> end(clusters.rbegin(), clusters.rend());
  end = fitting(end, columns - 1 - ofBeginning);
  std::ranges::reverse(end);
  return joined(fitting(clusters, ofBeginning)).append(ellipsis).append(joined(end));
}

}  // namespace palisade
