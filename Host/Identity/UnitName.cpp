#include "Host/Identity/UnitName.h"

#include <cstddef>
#include <vector>

namespace palisade {
namespace {

std::vector<std::string_view> split(std::string_view text, char divider) {
  std::vector<std::string_view> pieces;
  while (true) {
    const std::size_t end = text.find(divider);
    pieces.push_back(text.substr(0, end));
    if (end == std::string_view::npos) return pieces;
    text.remove_prefix(end + 1);
  }
}

std::optional<unsigned> hexDigit(char character) {
  constexpr std::string_view digits = "0123456789abcdef";
  const std::size_t value = digits.find(character);
  if (value == std::string_view::npos) return std::nullopt;
  return static_cast<unsigned>(value);
}

// Unit names escape as "\x2d" whatever would have a meaning in them; the dashes that remain divide.
std::optional<std::string> unescapedUnit(std::string_view text) {
  std::string result;
  for (std::size_t index = 0; index < text.size(); ++index) {
    if (text[index] != '\\') {
      result += text[index];
      continue;
    }
    if (index + 3 >= text.size() || text[index + 1] != 'x') return std::nullopt;
    const auto high = hexDigit(text[index + 2]);
    const auto low = hexDigit(text[index + 3]);
    if (!high || !low) return std::nullopt;
    const unsigned code = *high * 16 + *low;
    // A control character is in no application's name.
    if (code < 0x20 || code == 0x7f) return std::nullopt;
    result += static_cast<char>(code);
    index += 3;
  }
  if (result.empty()) return std::nullopt;
  return result;
}

}  // namespace

std::optional<std::string> applicationOfUnit(std::string_view unit) {
  const std::size_t dot = unit.rfind('.');
  if (dot == std::string_view::npos) return std::nullopt;
  const std::string_view type = unit.substr(dot);
  std::vector<std::string_view> pieces = split(unit.substr(0, dot), '-');
  if (pieces.front() != "app") return std::nullopt;

  if (type == ".service") {
    if (pieces.size() > 2 && pieces.back() == "autostart") {
      pieces.pop_back();
    } else {
      pieces.back() = pieces.back().substr(0, pieces.back().find('@'));
    }
  } else if (type == ".scope" || type == ".slice") {
    pieces.pop_back();
  } else {
    return std::nullopt;
  }
  const bool hasLauncher = pieces.size() == 3;
  if (pieces.size() != 2 && !hasLauncher) return std::nullopt;
  return unescapedUnit(pieces.back());
}

}  // namespace palisade
