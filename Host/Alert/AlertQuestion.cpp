#include "Host/Alert/AlertQuestion.h"

#include <algorithm>
#include <array>
#include <utility>

#include "Host/Alert/TerminalText.h"
#include "Host/Json/Json.h"

namespace palisade {
namespace {

constexpr std::string_view firstStrongIsolate = "\u2068";
constexpr std::string_view popDirectionalIsolate = "\u2069";

// A translator's help for the order of words, which turns nothing around.
bool isMark(std::string_view character) { return character == "\u200E" || character == "\u200F"; }

bool isOverride(std::string_view character) {
  return (character >= "\u202A" && character <= "\u202E") || (character >= "\u2066" && character <= "\u2069");
}

// The marks of all languages that sentences are written in, with the blanks and marks of direction that some put within them.
constexpr std::array<std::string_view, 13> openingMarks = {"“", "”", "„",  "«",       "「",      "『",     "‘",
                                                           "‹", "‚", "\"", "«\u00A0", "«\u202F", "“\u200F"};
constexpr std::array<std::string_view, 12> closingMarks = {"”", "“", "»",  "」",      "』",      "’",
                                                           "›", "‘", "\"", "\u00A0»", "\u202F»", "\u200F”"};

bool opensQuotation(std::string_view before) {
  return std::ranges::any_of(openingMarks, [&](std::string_view mark) { return before.ends_with(mark); });
}

bool closesQuotation(std::string_view behind) {
  return std::ranges::any_of(closingMarks, [&](std::string_view mark) { return behind.starts_with(mark); });
}

constexpr std::array<std::pair<AlertCertainty, std::string_view>, 4> certaintyNames = {
    {{AlertCertainty::certain, "certain"},
     {AlertCertainty::likely, "likely"},
     {AlertCertainty::claimedInSandbox, "claimed in a sandbox"},
     {AlertCertainty::claimed, "claimed"}}};

std::string_view nameOf(AlertCertainty certainty) {
  return std::ranges::find(certaintyNames, certainty, [](const auto& entry) { return entry.first; })->second;
}

// The text of that name; none when it is missing or no text.
const std::string* textIn(const Dictionary& object, std::string_view name) {
  const Value* value = object.find(name);
  return value == nullptr ? nullptr : value->string();
}

bool read(const Dictionary& object, std::string_view name, std::string& text) {
  const std::string* found = textIn(object, name);
  if (found != nullptr) text = *found;
  return found != nullptr;
}

std::optional<AlertSubject> subjectIn(const Dictionary& object) {
  AlertSubject subject;
  std::string certainty;
  if (!read(object, "name", subject.applicationName) || !read(object, "id", subject.applicationID) ||
      !read(object, "account", subject.account) || !read(object, "identity", certainty)) {
    return std::nullopt;
  }
  const auto found = std::ranges::find(certaintyNames, certainty, [](const auto& entry) { return entry.second; });
  if (found == certaintyNames.end()) return std::nullopt;
  subject.certainty = found->first;
  return subject;
}

}  // namespace

std::optional<std::string> alertQuestionFrame(const AlertQuestion& question) {
  Dictionary object{{"nonce", hexadecimal(question.nonce)}, {"title", question.title},
                    {"message", question.message},          {"refuse", question.refuseTitle},
                    {"allow", question.allowTitle},         {"languages", question.languages},
                    {"topmost", question.topMost},          {"display", question.networkDisplay}};
  if (question.subject) {
    const AlertSubject& subject = *question.subject;
    object.set("subject", Dictionary{{"name", subject.applicationName},
                                     {"id", subject.applicationID},
                                     {"identity", std::string(nameOf(subject.certainty))},
                                     {"account", subject.account}});
  }
  const std::string json = writeJson(object);
  if (json.size() > longestAlertQuestion) return std::nullopt;
  std::string frame;
  for (int shift = 0; shift < 32; shift += 8) frame += static_cast<char>(json.size() >> shift & 0xFF);
  return frame + json;
}

std::optional<std::uint32_t> lengthOfAlertQuestion(std::string_view fourBytes) {
  std::uint32_t length = 0;
  for (std::size_t index = 0; index < 4; ++index) {
    length |= std::uint32_t{static_cast<unsigned char>(fourBytes.at(index))} << (8 * index);
  }
  if (length > longestAlertQuestion) return std::nullopt;
  return length;
}

std::optional<AlertQuestion> alertQuestionFromJson(std::string_view json) {
  const auto parsed = NlohmannJsonParser(4, NullCharacters::refused).parse(json, JsonFragments::refused);
  const Dictionary* object = parsed.value ? parsed.value->dictionary() : nullptr;
  if (object == nullptr) return std::nullopt;

  AlertQuestion question;
  const std::string* digits = textIn(*object, "nonce");
  const auto nonce = digits == nullptr ? std::nullopt : nonceFromHexadecimal(*digits);
  const Value* topMost = object->find("topmost");
  if (!nonce || topMost == nullptr || topMost->boolean() == nullptr || !read(*object, "title", question.title) ||
      !read(*object, "message", question.message) || !read(*object, "refuse", question.refuseTitle) ||
      !read(*object, "allow", question.allowTitle) || !read(*object, "languages", question.languages) ||
      !read(*object, "display", question.networkDisplay)) {
    return std::nullopt;
  }
  question.nonce = *nonce;
  question.topMost = *topMost->boolean();
  if (const Value* subject = object->find("subject")) {
    if (subject->dictionary() == nullptr) return std::nullopt;
    question.subject = subjectIn(*subject->dictionary());
    if (!question.subject) return std::nullopt;
  }
  return question;
}

std::string oneLine(std::string_view text) {
  std::string line;
  const auto append = [&line](std::string_view plain) {
    for (const char byte : harmless(plain)) {
      if (byte != ' ' || !(line.empty() || line.ends_with(' '))) line += byte;
    }
  };
  while (!text.empty()) {
    const std::size_t special = std::min(text.find("\xE2\x80"), text.find("\xE2\x81"));
    append(text.substr(0, special));
    if (special == std::string_view::npos) break;
    const std::string_view character = text.substr(special, 3);
    if (isMark(character)) {
      line += character;
    } else if (!isOverride(character)) {
      append(character);
    }
    text.remove_prefix(special + character.size());
  }
  while (line.ends_with(' ')) line.pop_back();
  return line;
}

std::string isolated(const std::string& message, const std::string& name) {
  if (name.empty()) return message;
  std::string result;
  std::size_t position = 0;
  for (std::size_t found = message.find(name); found != std::string::npos; found = message.find(name, found + 1)) {
    const std::string_view whole = message;
    if (found < position || !opensQuotation(whole.substr(0, found)) || !closesQuotation(whole.substr(found + name.size())))
      continue;
    result.append(message, position, found - position);
    result.append(firstStrongIsolate).append(name).append(popDirectionalIsolate);
    position = found + name.size();
  }
  return result.append(message, position);
}

}  // namespace palisade
