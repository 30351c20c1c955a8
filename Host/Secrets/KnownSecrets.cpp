#include "Host/Secrets/KnownSecrets.h"

#include <sys/random.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <system_error>

namespace palisade {
namespace {

constexpr std::size_t ordinaryPiece = 12;
constexpr std::size_t shortestSecret = 6;
constexpr std::size_t longestSecret = 1024;
constexpr std::size_t mostPieces = std::size_t{1} << 16U;

constexpr std::string_view digits = "0123456789abcdef";
constexpr std::string_view upperCaseDigits = "0123456789ABCDEF";

std::string hexadecimal(std::string_view text, std::string_view numerals) {
  std::string written;
  for (const char character : text) {
    const auto byte = static_cast<unsigned char>(character);
    written += {numerals[byte >> 4U], numerals[byte & 15U]};
  }
  return written;
}

std::string percentEncoded(std::string_view text, std::string_view numerals) {
  constexpr std::string_view unreserved = "-._~";
  std::string written;
  for (const char character : text) {
    const bool isPlain = (character >= 'a' && character <= 'z') || (character >= 'A' && character <= 'Z') ||
                         (character >= '0' && character <= '9') || unreserved.find(character) != std::string_view::npos;
    written += isPlain ? std::string(1, character) : "%" + hexadecimal({&character, 1}, numerals);
  }
  return written;
}

std::string escaped(std::string_view text, std::string_view marks) {
  std::string written;
  for (const char character : text) {
    if (marks.find(character) != std::string_view::npos) written += '\\';
    written += character;
  }
  return written;
}

// The characters that are the same whatever stands after the text: those of whole groups of three bytes.
std::string base64(std::string_view text, std::string_view lastTwo) {
  std::string alphabet = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789";
  alphabet += lastTwo;
  std::string written;
  for (; text.size() >= 3; text.remove_prefix(3)) {
    std::uint32_t group = 0;
    for (int place = 0; place < 3; ++place)
      group = group << 8U | static_cast<unsigned char>(text[static_cast<unsigned>(place)]);
    for (unsigned shift = 24; shift > 0;) written += alphabet[group >> (shift -= 6U) & 63U];
  }
  return written;
}

// How a text may hold the secret. Base64 depends on what stands before it: on the number of bytes, modulo three.
std::vector<std::string> writingsOf(std::string_view secret) {
  std::vector<std::string> writings{std::string(secret),
                                    percentEncoded(secret, digits),
                                    percentEncoded(secret, upperCaseDigits),
                                    escaped(secret, "\\\""),
                                    escaped(secret, "\\\"/"),
                                    hexadecimal(secret, digits),
                                    hexadecimal(secret, upperCaseDigits)};
  for (const std::string_view lastTwo : {"+/", "-_"}) {
    for (std::size_t start = 0; start < std::min<std::size_t>(3, secret.size()); ++start) {
      writings.push_back(base64(secret.substr(start), lastTwo));
    }
  }
  std::ranges::sort(writings);
  const auto repeated = std::ranges::unique(writings);
  writings.erase(repeated.begin(), repeated.end());
  return writings;
}

std::uint64_t word(std::string_view bytes) {
  std::uint64_t value = 0;
  std::memcpy(&value, bytes.data(), std::min(bytes.size(), sizeof value));
  return value;
}

std::uint64_t mixed(std::uint64_t value, std::uint64_t key) {
  constexpr std::uint64_t odd = 0x9e3779b97f4a7c15U;
  value = (value ^ key) * odd;
  value = (value ^ (value >> 32U)) * odd;
  return value ^ (value >> 29U);
}

}  // namespace

KnownSecrets::KnownSecrets() {
  if (getrandom(_key.data(), sizeof _key, 0) != static_cast<ssize_t>(sizeof _key)) {
    throw std::system_error(errno, std::generic_category(), "cannot tell secrets from other texts: no random numbers");
  }
}

KnownSecrets& KnownSecrets::ofProcess() {
  // Never destroyed: what ends with the process may still be logged about.
  static auto* const known = new KnownSecrets;
  return *known;
}

void KnownSecrets::remember(std::string_view secret) {
  secret = secret.substr(0, longestSecret);
  if (secret.size() < shortestSecret) return;
  const std::uint64_t whole = hash(secret);
  {
    const std::lock_guard lock(_mutex);
    const auto known = _byWhole.find(whole);
    if (known != _byWhole.end()) {
      _secrets.splice(_secrets.begin(), _secrets, known->second);
      return;
    }
  }
  Secret added{.whole = whole, .pieces = {}};
  if (secret.size() < ordinaryPiece) {
    addPieces(secret, secret.size(), added);
  } else {
    for (const std::string& writing : writingsOf(secret)) addPieces(writing, ordinaryPiece, added);
  }

  const std::lock_guard lock(_mutex);
  if (_byWhole.contains(whole)) return;
  for (const auto& [length, pieces] : added.pieces) {
    for (const std::uint64_t piece : pieces) ++_pieces[length][piece];
  }
  _count += added.count;
  _secrets.push_front(std::move(added));
  _byWhole.emplace(whole, _secrets.begin());
  while (_count > mostPieces && _secrets.size() > 1) forgetOldest();
}

std::string KnownSecrets::withoutSecrets(std::string_view text) const {
  std::vector<bool> isSecret(text.size());
  {
    const std::lock_guard lock(_mutex);
    for (const auto& [length, known] : _pieces) {
      for (std::size_t place = 0; place + length <= text.size(); ++place) {
        if (!known.contains(hash(text.substr(place, length)))) continue;
        std::fill_n(isSecret.begin() + static_cast<std::ptrdiff_t>(place), length, true);
      }
    }
  }
  std::string result;
  for (std::size_t place = 0; place < text.size(); ++place) {
    if (!isSecret[place]) {
      result += text[place];
    } else if (place == 0 || !isSecret[place - 1]) {
      result += masked;
    }
  }
  return result;
}

std::uint64_t KnownSecrets::hash(std::string_view bytes) const {
  std::uint64_t value = mixed(bytes.size(), _key[0]);
  for (; bytes.size() > sizeof value; bytes.remove_prefix(sizeof value)) value = mixed(value ^ word(bytes), _key[1]);
  return mixed(value ^ word(bytes), _key[2]);
}

void KnownSecrets::addPieces(std::string_view writing, std::size_t length, Secret& secret) const {
  for (; writing.size() >= length; writing.remove_prefix(1)) {
    secret.pieces[length].push_back(hash(writing.substr(0, length)));
    ++secret.count;
  }
}

void KnownSecrets::forgetOldest() {
  const Secret& oldest = _secrets.back();
  for (const auto& [length, pieces] : oldest.pieces) {
    auto& known = _pieces[length];
    for (const std::uint64_t piece : pieces) {
      if (--known[piece] == 0) known.erase(piece);
    }
    if (known.empty()) _pieces.erase(length);
  }
  _count -= oldest.count;
  _byWhole.erase(oldest.whole);
  _secrets.pop_back();
}

}  // namespace palisade
