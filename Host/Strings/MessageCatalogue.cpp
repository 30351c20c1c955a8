#include "Host/Strings/MessageCatalogue.h"

#include <algorithm>
#include <cctype>
#include <cstdint>
#include <cstring>
#include <fstream>
#include <iterator>

namespace palisade {
namespace {

// Reads a catalogue in the byte order that it was written in. Nothing is read past the end.
class CatalogueReader {
 public:
  explicit CatalogueReader(std::string_view bytes) : _bytes(bytes) {}

  bool readHeader() {
    constexpr std::uint32_t magic = 0x950412DE;
    if (!hasWords(0, 7)) return false;
    _swapped = wordAt(0) != magic;
    if (wordAt(0) != magic) return false;
    _count = wordAt(8);
    _keys = wordAt(12);
    _texts = wordAt(16);
    return hasWords(_keys, 2 * _count) && hasWords(_texts, 2 * _count);
  }

  std::uint64_t count() const { return _count; }
  std::optional<std::string_view> key(std::uint64_t index) const { return textIn(_keys, index); }
  std::optional<std::string_view> text(std::uint64_t index) const { return textIn(_texts, index); }

 private:
  bool hasWords(std::uint64_t offset, std::uint64_t words) const {
    return offset + words * sizeof(std::uint32_t) <= _bytes.size();
  }

  std::uint32_t wordAt(std::uint64_t offset) const {
    std::uint32_t word = 0;
    std::memcpy(&word, _bytes.data() + offset, sizeof word);
    return _swapped ? __builtin_bswap32(word) : word;
  }

  // A table holds a length and an offset for each text, and a zero byte follows the text. Its other numbers, or the plural of
  // a key, stand behind a zero byte of their own.
  std::optional<std::string_view> textIn(std::uint64_t table, std::uint64_t index) const {
    const std::uint64_t length = wordAt(table + 8 * index);
    const std::uint64_t offset = wordAt(table + 8 * index + 4);
    if (offset + length >= _bytes.size() || _bytes[offset + length] != '\0') return std::nullopt;
    const std::string_view whole = _bytes.substr(offset, length);
    return whole.substr(0, whole.find('\0'));
  }

  std::string_view _bytes;
  bool _swapped = false;
  std::uint64_t _count = 0;
  std::uint64_t _keys = 0;
  std::uint64_t _texts = 0;
};

bool isInUtf8(const CatalogueTexts& texts) {
  constexpr std::string_view declaration = "charset=utf-8";
  const auto header = texts.find("");
  return header != texts.end() &&
         std::search(header->second.begin(), header->second.end(), declaration.begin(), declaration.end(),
                     [](unsigned char byte, char wanted) { return std::tolower(byte) == wanted; }) != header->second.end();
}

}  // namespace

std::optional<CatalogueTexts> catalogueTexts(std::string_view bytes) {
  CatalogueReader reader(bytes);
  if (!reader.readHeader()) return std::nullopt;
  CatalogueTexts texts;
  for (std::uint64_t index = 0; index < reader.count(); ++index) {
    const auto key = reader.key(index);
    const auto text = reader.text(index);
    if (!key || !text) return std::nullopt;
    texts.emplace(*key, *text);
  }
  return isInUtf8(texts) ? std::optional(std::move(texts)) : std::nullopt;
}

CatalogueTexts readCatalogue(const std::filesystem::path& path) {
  std::error_code problem;
  if (!std::filesystem::is_regular_file(path, problem)) return {};
  std::ifstream file(path, std::ios::binary);
  const std::string bytes{std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
  return file ? catalogueTexts(bytes).value_or(CatalogueTexts()) : CatalogueTexts();
}

}  // namespace palisade
