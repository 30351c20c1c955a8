#include "Sandbox/Form.h"

#include <charconv>

namespace palisade::sandbox {
namespace {

std::string decoded(std::string_view text) {
  std::string plain;
  for (std::size_t position = 0; position < text.size(); ++position) {
    unsigned code = 0;
    const char* const digits = text.data() + position + 1;
    if (text[position] == '%' && position + 2 < text.size() &&
        std::from_chars(digits, digits + 2, code, 16).ptr == digits + 2) {
      plain += static_cast<char>(code);
      position += 2;
    } else {
      plain += text[position] == '+' ? ' ' : text[position];
    }
  }
  return plain;
}

}  // namespace

Form parseForm(std::string_view text) {
  Form form;
  while (!text.empty()) {
    const std::string_view pair = text.substr(0, text.find('&'));
    text.remove_prefix(std::min(text.size(), pair.size() + 1));
    const std::size_t nameEnd = std::min(pair.find('='), pair.size());
    form.emplace(decoded(pair.substr(0, nameEnd)), decoded(pair.substr(std::min(pair.size(), nameEnd + 1))));
  }
  return form;
}

std::string field(const Form& form, std::string_view name) {
  const auto found = form.lower_bound(name);
  return found == form.end() || found->first != name ? std::string() : found->second;
}

long number(const Form& form, std::string_view name, long otherwise, long most) {
  const std::string text = field(form, name);
  long value = 0;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), value);
  return error != std::errc() || end != text.data() + text.size() || value < 0 || value > most ? otherwise : value;
}

}  // namespace palisade::sandbox
