#include "Host/Alert/TerminalText.h"

#include <wchar.h>

#include <clocale>
#include <cstdint>

namespace palisade {
namespace {

constexpr char32_t replacementCharacter = U'\uFFFD';

struct Decoded {
  char32_t character;
  std::size_t length;
};

// The first character of non-empty `text`. A malformed sequence is one byte long (RFC 3629 forbids overlong forms, surrogates
// and anything beyond U+10FFFF).
Decoded firstCharacter(std::string_view text) {
  const auto byte = [&](std::size_t index) { return static_cast<std::uint8_t>(text[index]); };
  const std::uint8_t lead = byte(0);
  if (lead < 0x80) return {lead, 1};
  const std::size_t length = lead >= 0xF0 && lead < 0xF5 ? 4 : lead >= 0xE0 ? 3 : 2;
  if (lead < 0xC2 || lead >= 0xF5 || text.size() < length) return {replacementCharacter, 1};
  char32_t character = lead & (0x7F >> length);
  for (std::size_t index = 1; index < length; ++index) {
    if ((byte(index) & 0xC0) != 0x80) return {replacementCharacter, 1};
    character = character << 6 | (byte(index) & 0x3F);
  }
  constexpr char32_t smallest[] = {0, 0, 0x80, 0x800, 0x10000};
  const bool isSurrogate = character >= 0xD800 && character < 0xE000;
  if (character < smallest[length] || character > 0x10FFFF || isSurrogate) return {replacementCharacter, 1};
  return {character, length};
}

bool isBidirectionalControl(char32_t character) {
  return character == U'\u061C' || character == U'\u200E' || character == U'\u200F' ||
         (character >= U'\u202A' && character <= U'\u202E') || (character >= U'\u2066' && character <= U'\u2069');
}

bool isControl(char32_t character) {
  return character < 0x20 || (character >= 0x7F && character < 0xA0) || character == U'\u2028' || character == U'\u2029';
}

// wcwidth(3) knows wide characters only in a UTF-8 locale, whatever locale the program runs in.
class Utf8CharacterType {
 public:
  Utf8CharacterType() : _earlier(uselocale(shared())) {}
  Utf8CharacterType(const Utf8CharacterType&) = delete;
  Utf8CharacterType& operator=(const Utf8CharacterType&) = delete;
  ~Utf8CharacterType() { uselocale(_earlier); }

 private:
  static locale_t shared() {
    static const locale_t utf8 = newlocale(LC_CTYPE_MASK, "C.UTF-8", nullptr);
    return utf8;
  }

  locale_t _earlier;
};

std::size_t columnsOf(char32_t character) {
  const int columns = wcwidth(static_cast<wchar_t>(character));
  return columns < 0 ? 1 : static_cast<std::size_t>(columns);
}

}  // namespace

std::size_t columnsOf(std::string_view text) {
  const Utf8CharacterType utf8;
  std::size_t columns = 0;
  while (!text.empty()) {
    const auto [character, length] = firstCharacter(text);
    columns += columnsOf(character);
    text.remove_prefix(length);
  }
  return columns;
}

std::string harmless(std::string_view text) {
  std::string result;
  while (!text.empty()) {
    const auto [character, length] = firstCharacter(text);
    if (character == replacementCharacter) {
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
  const Utf8CharacterType utf8;
  std::vector<std::string> lines(1);
  std::size_t used = 0;
  // Where the line may be broken: after its last blank.
  std::size_t breakAt = 0;
  while (!text.empty()) {
    const auto [character, length] = firstCharacter(text);
    const std::size_t width = columnsOf(character);
    if (used + width > columns && character != U' ') {
      std::string rest = breakAt > 0 ? lines.back().substr(breakAt) : std::string();
      if (breakAt > 0) lines.back().resize(breakAt);
      while (lines.back().ends_with(' ')) lines.back().pop_back();
      used = columnsOf(rest);
      lines.push_back(std::move(rest));
      breakAt = 0;
    }
    lines.back() += text.substr(0, length);
    used += width;
    if (character == U' ') breakAt = lines.back().size();
    text.remove_prefix(length);
  }
  while (lines.back().ends_with(' ')) lines.back().pop_back();
  return lines;
}

}  // namespace palisade
