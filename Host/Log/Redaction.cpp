#include "Host/Log/Redaction.h"

#include <algorithm>
#include <cctype>
#include <string>
#include <vector>

#include "Platform/Format.h"

namespace palisade {
namespace {

constexpr std::size_t shortestSecret = 32;

bool isTokenCharacter(char character) {
  return (character >= 'a' && character <= 'z') || (character >= 'A' && character <= 'Z') ||
         (character >= '0' && character <= '9') || std::string_view("-_~+=").find(character) != std::string_view::npos;
}

bool isSecretName(std::string_view name) {
  std::string lower(name);
  std::ranges::transform(lower, lower.begin(), [](unsigned char character) { return std::tolower(character); });
  return std::ranges::any_of(std::vector<std::string_view>{"token", "secret", "password", "authorization", "credential"},
                             [&](std::string_view word) { return lower.find(word) != std::string::npos; });
}

// An answer may repeat under another name what it holds under a secret one.
void rememberSecretsIn(const Value& value, bool isSecret = false) {
  if (const std::string* text = value.string()) {
    if (isSecret) KnownSecrets::ofProcess().remember(*text);
  } else if (const Array* array = value.array()) {
    for (const Value& element : *array) rememberSecretsIn(element, isSecret);
  } else if (const Dictionary* dictionary = value.dictionary()) {
    for (const auto& [name, entry] : *dictionary) rememberSecretsIn(entry, isSecret || isSecretName(name));
  }
}

}  // namespace

std::string redactedText(std::string_view text) {
  std::string result;
  while (!text.empty()) {
    const auto end = std::ranges::find_if_not(text, isTokenCharacter);
    const std::size_t length = static_cast<std::size_t>(end - text.begin());
    const std::string_view run = text.substr(0, length);
    // Permission names and identifiers are long too, but words joined by underscores hold no digits.
    const bool looksRandom = std::ranges::any_of(run, [](char character) { return character >= '0' && character <= '9'; }) ||
                             run.find('_') == std::string_view::npos;
    result += length >= shortestSecret && looksRandom ? masked : run;
    if (length < text.size()) result += text[length];
    text.remove_prefix(std::min(text.size(), length + 1));
  }
  return result;
}

Value redactedValue(const Value& value) {
  if (const std::string* text = value.string()) return redactedText(*text);
  if (const Array* array = value.array()) {
    Array redacted;
    std::ranges::transform(*array, std::back_inserter(redacted), redactedValue);
    return redacted;
  }
  if (const Dictionary* dictionary = value.dictionary()) {
    Dictionary redacted;
    for (const auto& [name, entry] : *dictionary) {
      redacted.set(redactedText(name), isSecretName(name) ? Value(masked) : redactedValue(entry));
    }
    return redacted;
  }
  return value;
}

std::string redactedMessage(const LogRecord& record) {
  for (const LogArgument& argument : record.arguments) {
    if (const auto* value = std::get_if<const Value*>(&argument.content())) rememberSecretsIn(**value);
  }
  std::vector<std::string> texts;
  texts.reserve(record.arguments.size());
  for (const LogArgument& argument : record.arguments) {
    const auto* value = std::get_if<const Value*>(&argument.content());
    texts.push_back(value != nullptr ? describe(redactedValue(**value)) : redactedText(describe(argument)));
  }
  const std::vector<LogArgument> arguments(texts.begin(), texts.end());
  LogRecord redacted = record;
  redacted.arguments = arguments;
  return KnownSecrets::ofProcess().withoutSecrets(formatLogMessage(redacted));
}

}  // namespace palisade
