#include "Cli/Table.h"

#include <algorithm>
#include <cstdlib>
#include <cwchar>

#include "Host/Text/PrintableText.h"

namespace palisade {
namespace {

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
    const std::string cell = printableText(cells[column]);
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
      widths[column] = std::max(widths[column], widthOf(printableText(cells[column])));
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
