#include "Host/Identity/DisplayName.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <optional>

#include "Host/Text/ValidText.h"

namespace palisade {
namespace {

constexpr std::size_t mostCharacters = 128;

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

}  // namespace

std::string displayName(std::string_view name) {
  std::string shown;
  std::size_t count = 0;
  bool isApart = false;
  while (!name.empty()) {
    const auto character = firstCharacter(name);
    const std::string_view bytes = name.substr(0, character ? character->length : 1);
    name.remove_prefix(bytes.size());
    if (!character) continue;
    if (character->code == ' ' || isBreak(character->code)) {
      isApart = !shown.empty();
      continue;
    }
    if (isUnseen(character->code)) continue;
    count += isApart ? 2 : 1;
    if (count > mostCharacters) return shown + "…";
    if (isApart) shown += ' ';
    isApart = false;
    shown += bytes;
  }
  return shown;
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
