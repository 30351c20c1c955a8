#include "Host/Text/ValidText.h"

#include <unistr.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>

namespace palisade {
namespace {

constexpr std::string_view replacement = "\uFFFD";

bool isPlain(char byte) { return byte > 0 && static_cast<unsigned char>(byte) < 0x80; }

// How many bytes the valid character takes that the text begins with; 0 when there is none.
std::size_t lengthOfFirst(std::string_view text) {
  ucs4_t character = 0;
  const int length = u8_mbtoucr(&character, reinterpret_cast<const std::uint8_t*>(text.data()), text.size());
  return length < 1 || character == 0 || isNoncharacter(character) ? 0 : static_cast<std::size_t>(length);
}

// How many bytes U+FFFD replaces: all of a character that may not stand, one byte of anything else.
std::size_t lengthOfRefused(std::string_view text) {
  ucs4_t character = 0;
  return static_cast<std::size_t>(
      std::max(1, u8_mbtoucr(&character, reinterpret_cast<const std::uint8_t*>(text.data()), text.size())));
}

// How many bytes of the text, from its beginning, are valid.
std::size_t lengthOfValid(std::string_view text) {
  auto position = static_cast<std::size_t>(std::ranges::find_if_not(text, isPlain) - text.begin());
  while (position < text.size()) {
    const std::size_t length = lengthOfFirst(text.substr(position));
    if (length == 0) break;
    position += length;
  }
  return position;
}

}  // namespace

bool isNoncharacter(char32_t character) {
  return (character >= U'\uFDD0' && character <= U'\uFDEF') || (character & 0xFFFE) == 0xFFFE;
}

bool isValidText(std::string_view text) { return lengthOfValid(text) == text.size(); }

std::string validText(std::string_view text) {
  std::string result;
  while (true) {
    const std::size_t valid = lengthOfValid(text);
    result += text.substr(0, valid);
    text.remove_prefix(valid);
    if (text.empty()) return result;
    result += replacement;
    text.remove_prefix(lengthOfRefused(text));
  }
}

std::string shortened(std::string_view text, std::size_t mostBytes) {
  constexpr std::string_view ellipsis = "…";
  if (text.size() <= mostBytes) return std::string(text);
  std::size_t end = mostBytes > ellipsis.size() ? mostBytes - ellipsis.size() : 0;
  while (end > 0 && (static_cast<unsigned char>(text[end]) & 0xC0) == 0x80) --end;
  return std::string(text.substr(0, end)).append(ellipsis);
}

}  // namespace palisade
