#include "Host/Alert/TerminalDialog.h"

#include <algorithm>

#include "Host/Alert/TerminalText.h"

namespace palisade {
namespace {

constexpr std::size_t widest = 76;
constexpr std::size_t narrowest = 30;
constexpr std::string_view bold = "\x1b[1m";
constexpr std::string_view reverse = "\x1b[7m";
constexpr std::string_view plain = "\x1b[0m";

std::string repeated(std::string_view text, std::size_t times) {
  std::string result;
  for (std::size_t count = 0; count < times; ++count) result += text;
  return result;
}

// One line of the frame: `shown` takes `shownColumns` columns on the screen, whatever escape sequences it holds.
std::string framed(std::string_view shown, std::size_t shownColumns, std::size_t inner) {
  const std::size_t padding = inner > shownColumns ? inner - shownColumns : 0;
  return "│ " + std::string(shown) + std::string(padding, ' ') + " │\r\n";
}

std::string button(std::string_view title, bool isSelected) {
  const std::string text = "[ " + std::string(title) + " ]";
  return isSelected ? std::string(reverse) + text + std::string(plain) : text;
}

}  // namespace

std::string drawDialog(const AlertDescription& description, DialogButton selected, std::size_t columns) {
  const std::size_t inner = std::clamp(columns, narrowest + 4, widest + 4) - 4;
  const std::string alternate = harmless(description.alternateButtonTitle);
  const std::string defaultTitle = harmless(description.defaultButtonTitle);

  std::string dialog = "┌" + repeated("─", inner + 2) + "┐\r\n";
  for (const std::string& line : wrapped(harmless(description.header), inner)) {
    dialog += framed(std::string(bold) + line + std::string(plain), columnsOf(line), inner);
  }
  dialog += framed("", 0, inner);
  for (const std::string& line : wrapped(harmless(description.message), inner)) dialog += framed(line, columnsOf(line), inner);
  dialog += framed("", 0, inner);

  const std::string buttons = button(alternate, selected == DialogButton::alternate) + "  " +
                              button(defaultTitle, selected == DialogButton::defaultButton);
  dialog += framed(buttons, columnsOf(alternate) + columnsOf(defaultTitle) + 10, inner);
  dialog += "└" + repeated("─", inner + 2) + "┘\r\n";
  return dialog;
}

}  // namespace palisade
