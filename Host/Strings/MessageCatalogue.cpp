#include "Host/Strings/MessageCatalogue.h"

#include <cstdint>
#include <cstring>
#include <fstream>
#include <iterator>

namespace palisade {
namespace {

// Reads the words of a catalogue in the byte order that it was written in. Nothing is read past the end.
class CatalogueWords {
 public:
  explicit CatalogueWords(std::string_view file) : _file(file) {}

  bool hasTable(std::uint64_t offset, std::uint64_t words) const {
    return offset + words * sizeof(std::uint32_t) <= _file.size();
  }

  std::uint32_t at(std::uint64_t offset) const {
    std::uint32_t word = 0;
    std::memcpy(&word, _file.data() + offset, sizeof word);
    return _swapped ? __builtin_bswap32(word) : word;
  }

  bool hasMagicNumber() {
    constexpr std::uint32_t magic = 0x950412DE;
    if (!hasTable(0, 1)) return false;
    _swapped = at(0) != magic;
    return at(0) == magic;
  }

  // A table of texts holds a length and an offset for each; a zero byte follows each text.
  bool hasTexts(std::uint64_t table, std::uint64_t count) const {
    if (!hasTable(table, 2 * count)) return false;
    for (std::uint64_t entry = table; entry < table + 8 * count; entry += 8) {
      const std::uint64_t end = std::uint64_t{at(entry)} + at(entry + 4);
      if (end >= _file.size() || _file[end] != '\0') return false;
    }
    return true;
  }

 private:
  std::string_view _file;
  bool _swapped = false;
};

}  // namespace

bool isWellFormedCatalogue(std::string_view file) {
  CatalogueWords words(file);
  if (!words.hasMagicNumber() || !words.hasTable(0, 7)) return false;
  const std::uint64_t count = words.at(8);
  if (!words.hasTexts(words.at(12), count) || !words.hasTexts(words.at(16), count)) return false;
  const std::uint64_t hashSize = words.at(20);
  const std::uint64_t hashTable = words.at(24);
  if (!words.hasTable(hashTable, hashSize)) return false;
  for (std::uint64_t entry = 0; entry < hashSize; ++entry) {
    if (words.at(hashTable + 4 * entry) > count) return false;
  }
  return true;
}

std::vector<char> readCatalogue(const std::filesystem::path& path) {
  std::error_code problem;
  if (!std::filesystem::is_regular_file(path, problem)) return {};
  std::ifstream file(path, std::ios::binary);
  std::vector<char> bytes{std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
  if (!file || !isWellFormedCatalogue({bytes.data(), bytes.size()})) return {};
  return bytes;
}

}  // namespace palisade
