#include "Tests/Strings/SentenceCheck.h"

#include <algorithm>
#include <array>
#include <sstream>

namespace palisade {
namespace {

struct QuotationMarks {
  std::string_view language;
  std::string_view opening;
  std::string_view closing;
};

// A language may have several pairs in good use. The blanks in the French ones are no-break spaces, wide and narrow.
constexpr QuotationMarks quotationMarks[] = {
    {"ar", "«", "»"},
    {"ar", "“", "”"},
    {"de", "„", "“"},
    {"en", "“", "”"},
    {"es", "«", "»"},
    {"fr", "«\u00A0", "\u00A0»"},
    {"fr", "«\u202F", "\u202F»"},
    {"he", "„", "”"},
    {"he", "“", "”"},
    {"he", "”", "”"},
    {"he", "״", "״"},
    {"it", "«", "»"},
    {"it", "“", "”"},
    {"ja", "「", "」"},
    {"ko", "‘", "’"},
    {"ko", "“", "”"},
    {"pt_BR", "“", "”"},
    {"ru", "«", "»"},
    {"zh_CN", "“", "”"},
    {"zh_TW", "「", "」"},
};

// Full stops and question marks of the languages that the tables are written in.
constexpr std::array<std::string_view, 5> sentenceEnds{".", "?", "。", "？", "؟"};

// Isolates and marks: they have no width.
constexpr std::array<std::string_view, 6> directionMarks{"\u200E", "\u200F", "\u2066", "\u2067", "\u2068", "\u2069"};

struct Unwanted {
  std::string_view part;
  const char* flaw;
};

constexpr Unwanted unwantedParts[] = {
    {"%", "a placeholder that nothing was put into"},
    {"  ", "two blanks in a row"},
    {" .", "a blank before a full stop"},
    {" 。", "a blank before a full stop"},
    {" ,", "a blank before a comma"},
    {" ،", "a blank before a comma"},
    {" 、", "a blank before a comma"},
    {" ，", "a blank before a comma"},
    {" :", "a breaking blank before a colon"},
    {" ”", "a blank before a closing quotation mark"},
    {" »", "a breaking blank before a closing quotation mark"},
    {" 」", "a blank before a closing quotation mark"},
    {"« ", "a breaking blank after an opening quotation mark"},
    {"„ ", "a blank after an opening quotation mark"},
    {"「 ", "a blank after an opening quotation mark"},
    {",,", "two commas in a row"},
    {"،،", "two commas in a row"},
    {"、、", "two commas in a row"},
    {"，，", "two commas in a row"},
    {"..", "two full stops in a row"},
    {"。。", "two full stops in a row"},
    {",.", "a comma before a full stop"},
    {"،.", "a comma before a full stop"},
    {"、。", "a comma before a full stop"},
    {"，。", "a comma before a full stop"},
    {"\"", "a straight quotation mark"},
    {"'", "a straight apostrophe"},
    {"\n", "a line break"},
};

std::size_t occurrences(std::string_view text, std::string_view part) {
  std::size_t count = 0;
  for (std::size_t at = text.find(part); at != std::string_view::npos; at = text.find(part, at + part.size())) ++count;
  return count;
}

std::string withoutDirectionMarks(std::string_view text) {
  std::string plain(text);
  for (const std::string_view mark : directionMarks) {
    for (std::size_t at = plain.find(mark); at != std::string::npos; at = plain.find(mark, at)) plain.erase(at, mark.size());
  }
  return plain;
}

// Some languages open with what closes in others.
bool isBlankBeforeOpening(std::string_view part, std::string_view language) {
  return part.starts_with(' ') && std::ranges::any_of(quotationMarks, [&](const QuotationMarks& marks) {
           return marks.language == language && marks.opening == part.substr(1);
         });
}

bool hasWordTwiceInARow(const std::string& text) {
  std::istringstream words(text);
  std::string earlier;
  for (std::string word; words >> word; earlier = word) {
    if (word == earlier) return true;
  }
  return false;
}

}  // namespace

bool isQuotedIn(std::string_view message, std::string_view text, std::string_view language) {
  const std::string plain = withoutDirectionMarks(message);
  return std::ranges::any_of(quotationMarks, [&](const QuotationMarks& marks) {
    if (marks.language != language) return false;
    std::string quoted(marks.opening);
    quoted.append(text).append(marks.closing);
    return plain.find(quoted) != std::string::npos;
  });
}

std::vector<std::string> flawsOf(std::string_view message, std::string_view applicationName, std::string_view language) {
  const std::string plain = withoutDirectionMarks(message);
  std::vector<std::string> flaws;
  for (const auto& [part, flaw] : unwantedParts) {
    if (plain.find(part) != std::string::npos && !isBlankBeforeOpening(part, language)) flaws.emplace_back(flaw);
  }
  if (hasWordTwiceInARow(plain)) flaws.emplace_back("a word twice in a row");
  if (plain.starts_with(' ') || plain.ends_with(' ')) flaws.emplace_back("a blank at the edge");
  if (std::ranges::none_of(sentenceEnds, [&](std::string_view end) { return plain.ends_with(end); })) {
    flaws.emplace_back("no full stop or question mark at the end");
  }
  if (occurrences(message, "\u2066") + occurrences(message, "\u2067") + occurrences(message, "\u2068") !=
      occurrences(message, "\u2069")) {
    flaws.emplace_back("a run of another direction that does not end");
  }
  if (const std::size_t count = occurrences(message, applicationName); count != 1) {
    flaws.push_back("the application's name " + std::to_string(count) + " times");
  } else if (!isQuotedIn(message, applicationName, language)) {
    flaws.emplace_back("the application's name without the language's quotation marks");
  }
  return flaws;
}

}  // namespace palisade
