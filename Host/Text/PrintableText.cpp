#include "Host/Text/PrintableText.h"

#include <unictype.h>
#include <unistr.h>

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <cstdio>

#include "Host/Text/ValidText.h"

namespace palisade {
namespace {

bool isJoiner(ucs4_t character) { return character == U'\u200C' || character == U'\u200D'; }

bool isPrintable(ucs4_t character) {
  constexpr std::uint32_t withoutALook = UC_CATEGORY_MASK_Cc | UC_CATEGORY_MASK_Cf | UC_CATEGORY_MASK_Zl | UC_CATEGORY_MASK_Zp;
  if (character >= ' ' && character < 0x7F) return true;
  return isJoiner(character) || !(uc_is_general_category_withtable(character, withoutALook) || isNoncharacter(character));
}

// Calls `write` with each character of valid text and its bytes.
template <typename Write>
void forEachCharacter(const std::string& text, const Write& write) {
  for (std::size_t position = 0; position < text.size();) {
    ucs4_t character = 0;
    const std::string_view rest = std::string_view(text).substr(position);
    const int length = u8_mbtoucr(&character, reinterpret_cast<const std::uint8_t*>(rest.data()), rest.size());
    const std::string_view bytes = rest.substr(0, static_cast<std::size_t>(std::max(1, length)));
    write(character, bytes);
    position += bytes.size();
  }
}

void appendEscape(std::string& json, std::uint32_t unit) {
  char digits[7];
  std::snprintf(digits, sizeof digits, "\\u%04x", unit & 0xFFFFU);
  json += digits;
}

}  // namespace

std::string printableText(std::string_view text) {
  std::string result;
  forEachCharacter(validText(text), [&](ucs4_t character, std::string_view bytes) {
    result += isPrintable(character) ? bytes : std::string_view("\uFFFD");
  });
  return result;
}

std::string printableJson(std::string_view json) {
  std::string result;
  forEachCharacter(validText(json), [&](ucs4_t character, std::string_view bytes) {
    if (isPrintable(character)) {
      result += bytes;
    } else if (character < 0x10000) {
      appendEscape(result, character);
    } else {
      appendEscape(result, 0xD7C0 + (character >> 10));
      appendEscape(result, 0xDC00 + (character & 0x3FF));
    }
  });
  return result;
}

}  // namespace palisade
