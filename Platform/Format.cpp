#include "Platform/Format.h"

#include <algorithm>
#include <charconv>
#include <cmath>
#include <functional>
#include <vector>

#include "Platform/Account.h"
#include "Platform/Client.h"

namespace palisade {
namespace {

// Copies `format`, with `argument(n)` in place of the n-th placeholder: "%" followed by one of `conversions`.
std::string fill(std::string_view format, std::string_view conversions, std::size_t argumentCount,
                 const std::function<std::string(std::size_t)>& argument) {
  std::string result;
  result.reserve(format.size());
  std::size_t next = 0;
  for (std::size_t position = 0; position < format.size(); ++position) {
    const bool isPlaceholder = format[position] == '%' && position + 1 < format.size() &&
                               conversions.find(format[position + 1]) != std::string_view::npos;
    if (!isPlaceholder) {
      result += format[position];
      continue;
    }
    if (next < argumentCount) result += argument(next++);
    ++position;
  }
  return result;
}

void appendQuoted(std::string& json, std::string_view text) {
  constexpr std::string_view hexDigits = "0123456789abcdef";
  json += '"';
  for (const char character : text) {
    switch (character) {
      case '"': json += "\\\""; break;
      case '\\': json += "\\\\"; break;
      case '\b': json += "\\b"; break;
      case '\f': json += "\\f"; break;
      case '\n': json += "\\n"; break;
      case '\r': json += "\\r"; break;
      case '\t': json += "\\t"; break;
      default:
        if (static_cast<unsigned char>(character) < 0x20) {
          json += "\\u00";
          json += hexDigits[static_cast<unsigned char>(character) >> 4];
          json += hexDigits[static_cast<unsigned char>(character) & 0xF];
        } else {
          json += character;
        }
    }
  }
  json += '"';
}

// JSON has no infinities and no NaN; null is what other writers put in their place.
void appendReal(std::string& json, double number) {
  if (!std::isfinite(number)) {
    json += "null";
    return;
  }
  // Plain digits where people would write them, an exponent beyond.
  const double size = std::fabs(number);
  const auto notation = size == 0 || (size >= 1e-4 && size < 1e16) ? std::chars_format::fixed : std::chars_format::scientific;
  char digits[64];
  const auto end = std::to_chars(std::begin(digits), std::end(digits), number, notation).ptr;
  const std::string_view written(digits, static_cast<std::size_t>(end - digits));
  json += written;
  if (written.find_first_of(".e") == std::string_view::npos) json += ".0";
}

void appendJson(std::string& json, const Value& value) {
  if (const bool* boolean = value.boolean()) {
    json += *boolean ? "true" : "false";
  } else if (const std::int64_t* integer = value.integer()) {
    json += std::to_string(*integer);
  } else if (const std::uint64_t* largeInteger = value.largeInteger()) {
    json += std::to_string(*largeInteger);
  } else if (const double* real = value.real()) {
    appendReal(json, *real);
  } else if (const std::string* text = value.string()) {
    appendQuoted(json, *text);
  } else if (const Array* array = value.array()) {
    json += '[';
    for (const Value& element : *array) {
      if (&element != &array->front()) json += ',';
      appendJson(json, element);
    }
    json += ']';
  } else if (const Dictionary* dictionary = value.dictionary()) {
    json += '{';
    bool isFirst = true;
    for (const auto& [key, entry] : *dictionary) {
      if (!isFirst) json += ',';
      isFirst = false;
      appendQuoted(json, key);
      json += ':';
      appendJson(json, entry);
    }
    json += '}';
  } else {
    json += "null";
  }
}

struct ArgumentDescriber {
  std::string operator()(std::monostate) const { return std::string(NoneRendering); }
  std::string operator()(std::string_view text) const { return std::string(text); }
  std::string operator()(std::int64_t number) const { return std::to_string(number); }
  std::string operator()(const Client* client) const { return client->description(); }
  std::string operator()(const Account* account) const { return account->description(); }
  std::string operator()(const Value* value) const { return describe(*value); }
  std::string operator()(const Error* error) const { return describe(*error); }
  std::string operator()(const PermissionSet* permissions) const { return describe(*permissions); }
};

}  // namespace

std::string formatText(std::string_view format, std::initializer_list<std::string_view> arguments) {
  return fill(format, "@", arguments.size(), [&](std::size_t index) { return std::string(arguments.begin()[index]); });
}

std::string formatLogMessage(const LogRecord& record) {
  return fill(record.format, "@d", record.arguments.size(),
              [&](std::size_t index) { return describe(record.arguments[index]); });
}

std::string compactJson(const Value& value) {
  std::string json;
  appendJson(json, value);
  return json;
}

std::string describe(const Value& value) { return value.string() != nullptr ? *value.string() : compactJson(value); }

std::string describe(const Error& error) {
  std::string text = error.domain + ' ' + std::to_string(error.code);
  if (error.description) text += ": " + *error.description;
  return text;
}

std::string describe(const PermissionSet& permissions) {
  std::vector<std::string_view> names(permissions.begin(), permissions.end());
  std::ranges::sort(names);
  std::string text = "{";
  for (const std::string_view& name : names) {
    if (&name != &names.front()) text += ", ";
    text += name;
  }
  return text + '}';
}

std::string describe(const LogArgument& argument) { return std::visit(ArgumentDescriber{}, argument.content()); }

}  // namespace palisade
