#include "Host/Alert/TerminalDialog.h"

#include <algorithm>

#include "Host/Alert/AlertWords.h"
#include "Host/Alert/TerminalText.h"

namespace palisade {
namespace {

constexpr std::size_t widest = 76;
constexpr std::size_t narrowest = 30;
constexpr std::size_t columnGap = 2;
constexpr std::string_view bold = "\x1b[1m";
constexpr std::string_view reverse = "\x1b[7m";
constexpr std::string_view faint = "\x1b[2m";
constexpr std::string_view plain = "\x1b[0m";

std::string repeated(std::string_view text, std::size_t times) {
  std::string result;
  for (std::size_t count = 0; count < times; ++count) result += text;
  return result;
}

std::string padded(std::string text, std::size_t columns) {
  const std::size_t used = columnsOf(text);
  return text.append(columns > used ? columns - used : 0, ' ');
}

// The lines of the dialog, from top to bottom, between the edges of the frame.
class Frame {
 public:
  explicit Frame(std::size_t columns) : _inner(std::clamp(columns, narrowest + 4, widest + 4) - 4) { addEdge("┌", "┐"); }

  void addEmptyLine() { addLine("", 0); }

  /// Whether the lines from here on are selected.
  void select(bool isSelected) { _edge = isSelected ? std::string(reverse) + " " + std::string(plain) : " "; }

  void addText(std::string_view text, std::string_view style = "") { addRow("", 0, text, style); }

  // Text beside a label that takes `labelColumns` columns.
  void addRow(std::string_view label, std::size_t labelColumns, std::string_view text, std::string_view style = "") {
    std::string side = padded(std::string(label), labelColumns);
    for (const std::string& line : wrapped(harmless(text), _inner - labelColumns)) {
      const std::string shown = style.empty() ? line : std::string(style) + line + std::string(plain);
      addLine(side + shown, labelColumns + columnsOf(line));
      side.assign(labelColumns, ' ');
    }
  }

  void addButtons(std::string_view first, std::string_view second, AlertPlace selected) {
    const std::string one = "[ " + harmless(first) + " ]";
    const std::string other = "[ " + harmless(second) + " ]";
    const auto shown = [](const std::string& button, bool isSelected) {
      return isSelected ? std::string(reverse) + button + std::string(plain) : button;
    };
    addLine(
        shown(one, selected == AlertPlace::refuse) + std::string(columnGap, ' ') + shown(other, selected == AlertPlace::allow),
        columnsOf(one) + columnGap + columnsOf(other));
  }

  std::string finished() {
    addEdge("└", "┘");
    return std::move(_lines);
  }

 private:
  void addEdge(std::string_view left, std::string_view right) {
    _lines.append(left).append(repeated("─", _inner + 2)).append(right).append("\r\n");
  }

  // `shown` takes `columns` columns on the screen, whatever escape sequences it holds.
  void addLine(std::string_view shown, std::size_t columns) {
    const std::size_t padding = _inner > columns ? _inner - columns : 0;
    _lines.append("│").append(_edge).append(shown).append(padding, ' ').append(" │\r\n");
  }

  std::size_t _inner;
  std::string _edge = " ";
  std::string _lines;
};

void addSubject(Frame& frame, const AlertSubject& subject, const AlertWords& words) {
  const std::size_t labels =
      std::max({columnsOf(words.application), columnsOf(words.identity), columnsOf(words.account)}) + columnGap;
  frame.addRow(words.application, labels, subject.applicationName);
  if (subject.applicationID != subject.applicationName) frame.addRow("", labels, subject.applicationID);
  frame.addRow(words.identity, labels, words.wordFor(subject.certainty), isOnlyClaimed(subject.certainty) ? bold : "");
  if (!subject.account.empty()) frame.addRow(words.account, labels, subject.account);
}

}  // namespace

std::string drawDialog(const AlertQuestion& question, AlertPlace selected, std::size_t columns) {
  const AlertWords& words = alertWordsFor(question.languages);
  Frame frame(columns);
  frame.select(selected == AlertPlace::text);
  frame.addText(question.title, bold);
  frame.addEmptyLine();
  frame.addText(question.message);
  frame.select(false);
  frame.addEmptyLine();
  if (question.subject) {
    frame.select(selected == AlertPlace::details);
    addSubject(frame, *question.subject, words);
    frame.select(false);
    frame.addEmptyLine();
  }
  frame.addButtons(question.refuseTitle, question.allowTitle, selected);
  frame.addText(words.keys, faint);
  return frame.finished();
}

}  // namespace palisade
