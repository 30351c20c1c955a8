#include "Host/Http/FormEncoding.h"

#include <string_view>

namespace palisade {
namespace {

bool standsForItself(char byte) {
  return (byte >= 'a' && byte <= 'z') || (byte >= 'A' && byte <= 'Z') || (byte >= '0' && byte <= '9') ||
         std::string_view("-._~").find(byte) != std::string_view::npos;
}

void append(std::string& form, std::string_view text) {
  static constexpr std::string_view digits = "0123456789ABCDEF";
  for (const char byte : text) {
    if (standsForItself(byte)) {
      form += byte;
    } else {
      const auto number = static_cast<unsigned char>(byte);
      form += '%';
      form += digits[number >> 4U];
      form += digits[number & 0x0FU];
    }
  }
}

}  // namespace

std::string formEncoded(std::span<const FormField> fields) {
  std::string form;
  for (const auto& [name, value] : fields) {
    if (!form.empty()) form += '&';
    append(form, name);
    form += '=';
    append(form, value);
  }
  return form;
}

}  // namespace palisade
