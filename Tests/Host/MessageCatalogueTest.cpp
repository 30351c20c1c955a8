#include "Host/Strings/MessageCatalogue.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdint>
#include <random>
#include <string>

#include "Tests/Host/CatalogueBytes.h"

using namespace palisade;
using testing::IsEmpty;
using testing::Not;

namespace {

std::filesystem::path compiledCatalogue() { return std::filesystem::path(LANGUAGES_FOLDER) / "de/LC_MESSAGES/Localizable.mo"; }

std::string compiledBytes() {
  const std::vector<char> bytes = readCatalogue(compiledCatalogue());
  return {bytes.begin(), bytes.end()};
}

std::string withWord(std::string bytes, std::size_t offset, std::uint32_t word) {
  for (std::size_t index = 0; index < 4; ++index) bytes[offset + index] = static_cast<char>(word >> (8 * index) & 0xFFU);
  return bytes;
}

// As a machine of the other byte order would have written the catalogue. The hash table, if any, is not reversed.
std::string withReversedWords(std::string bytes, std::size_t words) {
  for (std::size_t word = 0; word < words; ++word) {
    std::swap(bytes[4 * word], bytes[4 * word + 3]);
    std::swap(bytes[4 * word + 1], bytes[4 * word + 2]);
  }
  return bytes;
}

}  // namespace

TEST(ACompiledCatalogue, IsWellFormed) {
  EXPECT_TRUE(isWellFormedCatalogue(compiledBytes()));
  EXPECT_TRUE(isWellFormedCatalogue(catalogueBytes({})));
  EXPECT_TRUE(isWellFormedCatalogue(catalogueBytes({{"KEY", ""}})));
}

TEST(ACompiledCatalogue, MayBeOfEitherByteOrder) {
  const std::string bytes = catalogueBytes({{"KEY", "text"}});
  EXPECT_TRUE(isWellFormedCatalogue(withReversedWords(bytes, 7 + 8)));
}

TEST(ACatalogueThatWasCutOff, IsRefusedAtEveryLength) {
  const std::string bytes = compiledBytes();
  ASSERT_THAT(bytes, Not(IsEmpty()));
  for (std::size_t length = 0; length < bytes.size(); ++length) {
    EXPECT_FALSE(isWellFormedCatalogue(bytes.substr(0, length))) << length;
  }
}

TEST(ACatalogueWithAFalseHeader, IsRefused) {
  const std::string bytes = catalogueBytes({{"KEY", "text"}});
  const struct {
    const char* what;
    std::size_t offset;
    std::uint32_t word;
  } cases[] = {
      {"magic number", 0, 0x12345678},     {"count", 8, 1000},
      {"largest count", 8, 0xFFFFFFFF},    {"key table", 12, 10'000},
      {"text table", 16, 0xFFFFFFFC},      {"size of the hash table", 20, 1000},
      {"length of the key", 36, 100},      {"greatest length of the key", 36, 0xFFFFFFFF},
      {"place of the key", 40, 0x7FFFFFF}, {"a key without an end", 36, 2},
  };
  for (const auto& [what, offset, word] : cases) {
    EXPECT_FALSE(isWellFormedCatalogue(withWord(bytes, offset, word))) << what;
  }
}

TEST(ACatalogueWhoseHashTableNamesNoText, IsRefused) {
  const std::string bytes = compiledBytes();
  std::uint32_t hashTable = 0;
  for (std::size_t index = 0; index < 4; ++index) {
    hashTable |= std::uint32_t{static_cast<unsigned char>(bytes[24 + index])} << (8 * index);
  }
  EXPECT_FALSE(isWellFormedCatalogue(withWord(bytes, hashTable, 1000)));
}

TEST(ACatalogueFile, IsEmptyUnlessItIsAWellFormedFile) {
  EXPECT_THAT(readCatalogue(compiledCatalogue()), Not(IsEmpty()));
  EXPECT_THAT(readCatalogue(compiledCatalogue().parent_path()), IsEmpty());
  EXPECT_THAT(readCatalogue(compiledCatalogue().parent_path() / "Other.mo"), IsEmpty());
  EXPECT_THAT(readCatalogue("/dev/zero"), IsEmpty());
  EXPECT_THAT(readCatalogue(__FILE__), IsEmpty());
}
