#include "Host/Identity/KeyFile.h"

#include <cstddef>

namespace palisade {
namespace {

constexpr std::string_view blanks = " \t\r";

std::string_view trimmed(std::string_view text) {
  const std::size_t first = text.find_first_not_of(blanks);
  if (first == std::string_view::npos) return {};
  return text.substr(first, text.find_last_not_of(blanks) - first + 1);
}

// Sequences that mean nothing here stay as they are: values of other kinds have more of them.
std::string unescaped(std::string_view text) {
  constexpr std::string_view letters = "sntr\\";
  constexpr std::string_view meanings = " \n\t\r\\";
  std::string result;
  for (std::size_t index = 0; index < text.size(); ++index) {
    const bool isEscape = text[index] == '\\' && index + 1 < text.size();
    const std::size_t letter = isEscape ? letters.find(text[index + 1]) : std::string_view::npos;
    if (letter == std::string_view::npos) {
      result += text[index];
    } else {
      result += meanings[letter];
      ++index;
    }
  }
  return result;
}

}  // namespace

std::optional<KeyFile> keyFileFromText(std::string_view text) {
  KeyFile file;
  KeyFileGroup* group = nullptr;
  if (text.find('\0') != std::string_view::npos) return std::nullopt;
  while (!text.empty()) {
    const std::size_t end = text.find('\n');
    const std::string_view line = trimmed(text.substr(0, end));
    text.remove_prefix(end == std::string_view::npos ? text.size() : end + 1);
    if (line.empty() || line.front() == '#') continue;

    if (line.front() == '[') {
      const std::string_view name = line.substr(1, line.size() - 2);
      if (line.back() != ']' || name.empty() || name.find_first_of("[]") != std::string_view::npos) return std::nullopt;
      const auto [position, isNew] = file.try_emplace(std::string(name));
      if (!isNew) return std::nullopt;
      group = &position->second;
      continue;
    }

    const std::size_t sign = line.find('=');
    if (group == nullptr || sign == std::string_view::npos) return std::nullopt;
    const std::string_view key = trimmed(line.substr(0, sign));
    if (key.empty() || !group->try_emplace(std::string(key), unescaped(trimmed(line.substr(sign + 1)))).second) {
      return std::nullopt;
    }
  }
  return file;
}

}  // namespace palisade
