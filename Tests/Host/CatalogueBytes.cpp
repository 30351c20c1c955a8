#include "Tests/Host/CatalogueBytes.h"

#include <cstdint>
#include <vector>

namespace {

constexpr std::uint32_t headerSize = 28;

void appendWord(std::string& bytes, std::size_t word) {
  for (unsigned shift = 0; shift < 32; shift += 8) bytes += static_cast<char>(word >> shift & 0xFFU);
}

}  // namespace

std::string catalogueBytes(std::map<std::string, std::string> texts) {
  texts.try_emplace("", "Content-Type: text/plain; charset=UTF-8\n");
  std::string keys;
  std::string translations;
  std::string pool;
  const std::size_t poolStart = headerSize + 16 * texts.size();
  const auto append = [&pool, poolStart](std::string& table, const std::string& text) {
    appendWord(table, text.size());
    appendWord(table, poolStart + pool.size());
    pool += text + '\0';
  };
  for (const auto& [key, text] : texts) {
    append(keys, key);
    append(translations, text);
  }
  std::string bytes;
  for (const std::size_t word : {std::size_t{0x950412DE}, std::size_t{0}, texts.size(), std::size_t{headerSize},
                                 headerSize + 8 * texts.size(), std::size_t{0}, std::size_t{0}}) {
    appendWord(bytes, word);
  }
  return bytes + keys + translations + pool;
}
