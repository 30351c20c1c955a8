#include "Host/Alert/AccessQuestion.h"

#include <array>
#include <string_view>
#include <utility>

#include "Host/Alert/AlertWords.h"

namespace palisade {
namespace {

std::string replaced(std::string text, std::string_view what, std::string_view by) {
  for (std::size_t found = text.find(what); found != std::string::npos; found = text.find(what, found + by.size())) {
    text.replace(found, what.size(), by);
  }
  return text;
}

// A word joiner cannot be seen, and ends what could be an entity.
std::string withoutMarkup(std::string text) {
  constexpr std::array<std::pair<std::string_view, std::string_view>, 3> lookAlikes = {
      {{"<", "‹"}, {">", "›"}, {"&", "&\u2060"}}};
  for (const auto& [special, plain] : lookAlikes) text = replaced(std::move(text), special, plain);
  return text;
}

// An underscore would underline the letter behind it, as the button's key.
std::string label(const std::string& text) { return replaced(withoutMarkup(text), "_", "__"); }

// Between U+2068 and U+2069: a name stays in one piece beside words of the other direction.
std::string isolatedName(const std::string& name) { return "\u2068" + withoutMarkup(name) + "\u2069"; }

// The names are lines of their own making only here: they hold no line breaks.
std::string bodyFor(const AlertSubject& subject, const AlertWords& words) {
  const auto line = [](std::string_view what, const std::string& text) { return std::string(what) + ": " + text; };
  std::string body = line(words.application, isolatedName(subject.applicationName));
  if (subject.applicationID != subject.applicationName) body += "\n" + isolatedName(subject.applicationID);
  body += "\n" + line(words.identity, std::string(words.wordFor(subject.certainty)));
  if (!subject.account.empty()) body += "\n" + line(words.account, isolatedName(subject.account));
  return body;
}

}  // namespace

AccessQuestion accessQuestion(const AlertQuestion& question) {
  return {.title = replaced(withoutMarkup(question.title), "%", "٪"),
          .subtitle = withoutMarkup(question.message),
          .body = question.subject ? bodyFor(*question.subject, alertWordsFor(question.languages)) : "",
          .denyLabel = label(question.refuseTitle),
          .grantLabel = label(question.allowTitle)};
}

}  // namespace palisade
