#include "Host/Alert/AlertAnswer.h"

#include <sys/random.h>

#include <cerrno>
#include <system_error>

namespace palisade {
namespace {

constexpr std::string_view magic = "PAL1";
constexpr std::string_view digits = "0123456789abcdef";

template <typename Number>
void append(Number number, std::string& bytes) {
  for (std::size_t index = 0; index < sizeof number; ++index) bytes += static_cast<char>(number >> (8 * index) & 0xFF);
}

// FNV-1a over 64 bits: two frames that differ in one byte never have the same check.
std::uint64_t checkOf(std::string_view bytes) {
  std::uint64_t check = 0xcbf29ce484222325;
  for (const char byte : bytes) check = (check ^ static_cast<unsigned char>(byte)) * 0x100000001b3;
  return check;
}

}  // namespace

AlertNonce freshNonce() {
  AlertNonce nonce{};
  // Up to 256 bytes come whole (getrandom(2)).
  if (getrandom(nonce.data(), nonce.size(), 0) != static_cast<ssize_t>(nonce.size())) {
    throw std::system_error(errno, std::generic_category(), "no random numbers for an alert");
  }
  return nonce;
}

std::string hexadecimal(const AlertNonce& nonce) {
  std::string text;
  for (const std::uint8_t byte : nonce) {
    text += digits[byte >> 4];
    text += digits[byte & 0xF];
  }
  return text;
}

std::optional<AlertNonce> nonceFromHexadecimal(std::string_view text) {
  AlertNonce nonce{};
  if (text.size() != 2 * nonce.size()) return std::nullopt;
  for (std::size_t index = 0; index < nonce.size(); ++index) {
    const std::size_t high = digits.find(text[2 * index]);
    const std::size_t low = digits.find(text[2 * index + 1]);
    if (high == std::string_view::npos || low == std::string_view::npos) return std::nullopt;
    nonce[index] = static_cast<std::uint8_t>(high << 4 | low);
  }
  return nonce;
}

std::string alertAnswerFrame(const AlertNonce& nonce, AlertWord word) {
  std::string frame(magic);
  frame.append(nonce.begin(), nonce.end());
  append(static_cast<std::uint32_t>(word), frame);
  append(checkOf(frame), frame);
  return frame;
}

// There are three right frames. Comparing whole frames leaves no byte unread.
std::optional<AlertWord> wordOfAlertAnswer(std::string_view bytes, const AlertNonce& nonce) {
  for (const AlertWord word : {AlertWord::closed, AlertWord::refused, AlertWord::allowed}) {
    if (bytes == alertAnswerFrame(nonce, word)) return word;
  }
  return std::nullopt;
}

}  // namespace palisade
