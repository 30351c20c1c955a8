#include "Host/Identity/DisplayName.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <optional>

#include "Host/Text/QuotableText.h"
#include "Host/Text/ValidText.h"

namespace palisade {
namespace {

constexpr std::size_t columnsOfName = 40;
constexpr std::size_t columnsOfIdentifier = 120;

struct Character {
  char32_t code;
  std::size_t length;
};

// The character that the text begins with, or none when that is no UTF-8: overlong forms, surrogates and the like included.
std::optional<Character> firstCharacter(std::string_view text) {
  struct Form {
    unsigned char mask, lead;
    char32_t smallest;
  };
  static constexpr std::array<Form, 4> forms = {
      {{0x80, 0x00, 0x0}, {0xe0, 0xc0, 0x80}, {0xf0, 0xe0, 0x800}, {0xf8, 0xf0, 0x10000}}};
  const auto byte = [&](std::size_t index) { return static_cast<unsigned char>(text[index]); };
  for (std::size_t form = 0; form < forms.size(); ++form) {
    const auto [mask, lead, smallest] = forms[form];
    if ((byte(0) & mask) != lead) continue;
    const std::size_t length = form + 1;
    if (text.size() < length) return std::nullopt;
    char32_t code = byte(0) & static_cast<unsigned char>(~mask);
    for (std::size_t index = 1; index < length; ++index) {
      if ((byte(index) & 0xc0) != 0x80) return std::nullopt;
      code = (code << 6) | (byte(index) & 0x3f);
    }
    const bool isSurrogate = code >= 0xd800 && code <= 0xdfff;
    if (code < smallest || code > 0x10ffff || isSurrogate) return std::nullopt;
    return Character{.code = code, .length = length};
  }
  return std::nullopt;
}

bool isBreak(char32_t code) { return (code >= '\t' && code <= '\r') || code == 0x85 || code == 0x2028 || code == 0x2029; }

// Spaces of every width, and letters that are drawn as nothing.
bool isBlank(char32_t code) {
  static constexpr std::array<char32_t, 12> others = {0x20,   0xa0,   0x115f, 0x1160, 0x1680, 0x202f,
                                                      0x205f, 0x2800, 0x3000, 0x3164, 0xffa0, 0x180e};
  return (code >= 0x2000 && code <= 0x200a) || std::ranges::count(others, code) > 0;
}

// Controls, marks and overrides of direction, and characters that nobody sees. The joiners of Persian, Indic scripts and
// emoji (U+200C, U+200D) change what people see, and stay.
bool isUnseen(char32_t code) {
  struct Range {
    char32_t first, last;
  };
  static constexpr std::array<Range, 11> ranges = {{{0x0, 0x1f},
                                                    {0x7f, 0x9f},
                                                    {0xad, 0xad},
                                                    {0x61c, 0x61c},
                                                    {0x200b, 0x200b},
                                                    {0x200e, 0x200f},
                                                    {0x2028, 0x202e},
                                                    {0x2060, 0x206f},
                                                    {0xfeff, 0xfeff},
                                                    {0xfff9, 0xfffb},
                                                    {0xe0000, 0xe007f}}};
  return isNoncharacter(code) || std::any_of(ranges.begin(), ranges.end(),
                                             [code](const Range& range) { return code >= range.first && code <= range.last; });
}

// On one line, without what nobody sees.
std::string onOneLine(std::string_view text) {
  std::string shown;
  bool isApart = false;
  while (!text.empty()) {
    const auto character = firstCharacter(text);
    const std::string_view bytes = text.substr(0, character ? character->length : 1);
    text.remove_prefix(bytes.size());
    if (!character) continue;
    if (isBlank(character->code) || isBreak(character->code)) {
      isApart = !shown.empty();
      continue;
    }
    if (isUnseen(character->code)) continue;
    if (isApart) shown += ' ';
    isApart = false;
    shown += bytes;
  }
  return shown;
}

}  // namespace

std::string displayName(std::string_view name) { return fitted(quotable(onOneLine(name)), columnsOfName); }

std::string displayNameOfProgram(std::string_view path) { return fittedInItsMiddle(quotable(onOneLine(path)), columnsOfName); }

std::string displayIdentifier(std::string_view identifier) {
  return fittedInItsMiddle(onOneLine(identifier), columnsOfIdentifier);
}

bool isShownAsItIs(std::string_view text) {
  while (!text.empty()) {
    const auto character = firstCharacter(text);
    if (!character || isUnseen(character->code)) return false;
    text.remove_prefix(character->length);
  }
  return true;
}

}  // namespace palisade
