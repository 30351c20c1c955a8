#include "Cli/Table.h"

#include <algorithm>
#include <cstdlib>
#include <cwchar>
#include <cwctype>

namespace palisade {
namespace {

// Characters that would turn the direction of the rest of the line.
bool turnsDirection(wchar_t character) {
  return (character >= 0x202A && character <= 0x202E) || (character >= 0x2066 && character <= 0x2069);
}

// The text with a "?" for whatever is no character, or moves the cursor or the text around it.
std::string printable(const std::string& text) {
  std::string result;
  std::mbstate_t state{};
  for (std::size_t position = 0; position < text.size();) {
    wchar_t character = 0;
    const std::size_t length = std::mbrtowc(&character, &text[position], text.size() - position, &state);
    const bool isCharacter = length > 0 && length <= text.size() - position;
    if (isCharacter && std::iswprint(static_cast<wint_t>(character)) != 0 && !turnsDirection(character)) {
      result.append(text, position, length);
    } else {
      result += '?';
    }
    if (!isCharacter) state = {};
    position += isCharacter ? length : 1;
  }
  return result;
}

// Columns on the screen, of printable text.
std::size_t widthOf(const std::string& text) {
  std::wstring wide(text.size(), L'\0');
  const std::size_t length = std::mbstowcs(wide.data(), text.c_str(), wide.size());
  if (length == static_cast<std::size_t>(-1)) return text.size();
  const int width = wcswidth(wide.data(), length);
  return width < 0 ? text.size() : static_cast<std::size_t>(width);
}

std::string line(const std::vector<std::string>& cells, const std::vector<std::size_t>& widths) {
  std::string text;
  for (std::size_t column = 0; column < cells.size(); ++column) {
    const std::string cell = printable(cells[column]);
    text += cell;
    if (column + 1 < cells.size()) text += std::string(widths[column] - widthOf(cell) + 2, ' ');
  }
  return text + "\n";
}

}  // namespace

std::string Table::text(bool isColoured) const {
  std::vector<std::size_t> widths(_headings.size());
  const auto widen = [&](const std::vector<std::string>& cells) {
    for (std::size_t column = 0; column < cells.size(); ++column) {
      widths[column] = std::max(widths[column], widthOf(printable(cells[column])));
    }
  };
  widen(_headings);
  std::ranges::for_each(_rows, widen);

  const std::string headings = line(_headings, widths);
  std::string text = isColoured ? "\x1b[1m" + headings.substr(0, headings.size() - 1) + "\x1b[0m\n" : headings;
  for (const auto& row : _rows) text += line(row, widths);
  return text;
}

}  // namespace palisade
