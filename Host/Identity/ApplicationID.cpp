#include "Host/Identity/ApplicationID.h"

#include <algorithm>
#include <cstddef>

namespace palisade {
namespace {

constexpr std::size_t longestID = 255;

// Letters and digits of the C locale, whatever the process has set.
bool isLower(char character) { return character >= 'a' && character <= 'z'; }
bool isUpper(char character) { return character >= 'A' && character <= 'Z'; }
bool isDigit(char character) { return character >= '0' && character <= '9'; }

bool isElementCharacter(char character) {
  return isLower(character) || isUpper(character) || isDigit(character) || character == '-' || character == '_';
}

bool isSnapCharacter(char character) {
  return isLower(character) || isDigit(character) || character == '-' || character == '_';
}

}  // namespace

bool isApplicationID(std::string_view text) {
  if (text.size() > longestID) return false;
  std::size_t elements = 0;
  while (true) {
    const std::size_t dot = text.find('.');
    const std::string_view element = text.substr(0, dot);
    if (element.empty() || !std::all_of(element.begin(), element.end(), isElementCharacter)) return false;
    ++elements;
    if (dot == std::string_view::npos) return elements >= 2;
    text.remove_prefix(dot + 1);
  }
}

bool isSnapName(std::string_view text) {
  return !text.empty() && text.size() <= longestID && text.front() != '_' && text.front() != '-' &&
         std::all_of(text.begin(), text.end(), isSnapCharacter);
}

}  // namespace palisade
