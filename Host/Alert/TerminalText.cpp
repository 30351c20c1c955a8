#include "Host/Alert/TerminalText.h"

#include <unilbrk.h>
#include <unistr.h>
#include <uniwidth.h>

namespace palisade {
namespace {

constexpr const char* encoding = "UTF-8";

struct Decoded {
  ucs4_t character;
  std::size_t length;
};

const std::uint8_t* bytesOf(std::string_view text) { return reinterpret_cast<const std::uint8_t*>(text.data()); }

// The first character of non-empty `text`; a byte that begins none is U+FFFD.
Decoded firstCharacter(std::string_view text) {
  Decoded decoded{};
  const int length = u8_mbtoucr(&decoded.character, bytesOf(text), text.size());
  if (length < 1) return {.character = U'\uFFFD', .length = 1};
  decoded.length = static_cast<std::size_t>(length);
  return decoded;
}

bool isBidirectionalControl(ucs4_t character) {
  return character == U'\u061C' || character == U'\u200E' || character == U'\u200F' ||
         (character >= U'\u202A' && character <= U'\u202E') || (character >= U'\u2066' && character <= U'\u2069');
}

bool isControl(ucs4_t character) {
  return character < 0x20 || (character >= 0x7F && character < 0xA0) || character == U'\u2028' || character == U'\u2029';
}

bool isHangul(ucs4_t character) {
  return (character >= 0x1100 && character < 0x1200) || (character >= 0x3130 && character < 0x3190) ||
         (character >= 0xA960 && character < 0xA980) || (character >= 0xAC00 && character < 0xD800);
}

}  // namespace

std::size_t columnsOf(std::string_view text) {
  return static_cast<std::size_t>(u8_width(bytesOf(text), text.size(), encoding));
}

std::string harmless(std::string_view text) {
  std::string result;
  while (!text.empty()) {
    const auto [character, length] = firstCharacter(text);
    if (character == U'\uFFFD') {
      result += "\uFFFD";
    } else if (isControl(character)) {
      result += ' ';
    } else if (!isBidirectionalControl(character)) {
      result += text.substr(0, length);
    }
    text.remove_prefix(length);
  }
  return result;
}

std::vector<std::string> wrapped(std::string_view text, std::size_t columns) {
  // What is known of the place before each byte (UAX #14).
  std::string breaks(text.size(), UC_BREAK_PROHIBITED);
  u8_possible_linebreaks(bytesOf(text), text.size(), encoding, breaks.data());

  std::vector<std::string> lines(1);
  std::size_t used = 0;
  // Where the line may be broken; 0 is nowhere.
  std::size_t breakAt = 0;
  ucs4_t previous = ' ';
  for (std::size_t place = 0; place < text.size();) {
    const auto [character, length] = firstCharacter(text.substr(place));
    const std::string_view shown = text.substr(place, length);
    const std::size_t width = columnsOf(shown);
    const bool isWithinKoreanWord = previous != ' ' && (isHangul(previous) || isHangul(character));
    if (breaks[place] == UC_BREAK_POSSIBLE && !isWithinKoreanWord) breakAt = lines.back().size();
    // Blanks may stand beyond the edge: they go when the line ends.
    while (used > 0 && used + width > columns && character != ' ') {
      std::string rest = breakAt > 0 ? lines.back().substr(breakAt) : std::string();
      if (breakAt > 0) lines.back().resize(breakAt);
      while (lines.back().ends_with(' ')) lines.back().pop_back();
      used = columnsOf(rest);
      lines.push_back(std::move(rest));
      breakAt = 0;
    }
    lines.back() += shown;
    used += width;
    previous = character;
    place += length;
  }
  while (lines.back().ends_with(' ')) lines.back().pop_back();
  return lines;
}

}  // namespace palisade
