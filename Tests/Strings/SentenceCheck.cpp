#include "Tests/Strings/SentenceCheck.h"

#include <algorithm>
#include <array>

namespace palisade {
namespace {

// Full stops and question marks of the languages that the tables are written in.
constexpr std::array<std::string_view, 4> sentenceEnds{".", "?", "。", "؟"};

std::size_t occurrences(std::string_view text, std::string_view part) {
  std::size_t count = 0;
  for (std::size_t at = text.find(part); at != std::string_view::npos; at = text.find(part, at + part.size())) ++count;
  return count;
}

}  // namespace

std::vector<std::string> flawsOf(std::string_view message, std::string_view appName) {
  constexpr struct {
    std::string_view part;
    const char* flaw;
  } unwanted[] = {
      {"%", "a placeholder that nothing was put into"},
      {"  ", "two blanks in a row"},
      {" .", "a blank before a full stop"},
      {" ,", "a blank before a comma"},
      {" ”", "a blank before a closing quotation mark"},
      {"“ ", "a blank after an opening quotation mark"},
      {",,", "two commas in a row"},
      {"..", "two full stops in a row"},
      {",.", "a comma before a full stop"},
      {"and and", "a word twice in a row"},
      {"to to", "a word twice in a row"},
      {"your your", "a word twice in a row"},
      {"\"", "a straight quotation mark"},
      {"'", "a straight apostrophe"},
      {"\n", "a line break"},
  };

  std::vector<std::string> flaws;
  for (const auto& [part, flaw] : unwanted) {
    if (message.find(part) != std::string_view::npos) flaws.emplace_back(flaw);
  }
  if (message.starts_with(' ') || message.ends_with(' ')) flaws.emplace_back("a blank at the edge");
  if (std::ranges::none_of(sentenceEnds, [&](std::string_view end) { return message.ends_with(end); })) {
    flaws.emplace_back("no full stop or question mark at the end");
  }
  if (const std::size_t count = occurrences(message, appName); count != 1) {
    flaws.push_back("the application's name " + std::to_string(count) + " times");
  }
  return flaws;
}

}  // namespace palisade
