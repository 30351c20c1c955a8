#include "Host/Strings/MessageCatalogue.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdint>
#include <fstream>
#include <iterator>
#include <random>
#include <string>

#include "Tests/Host/CatalogueBytes.h"

using namespace palisade;
using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Key;
using testing::Not;
using testing::Optional;
using testing::Pair;

namespace {

std::filesystem::path compiledCatalogue() { return std::filesystem::path(LANGUAGES_FOLDER) / "de/LC_MESSAGES/Localizable.mo"; }

std::string compiledBytes() {
  std::ifstream file(compiledCatalogue(), std::ios::binary);
  return {std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
}

std::string withWord(std::string bytes, std::size_t offset, std::uint32_t word) {
  for (std::size_t index = 0; index < 4; ++index) bytes[offset + index] = static_cast<char>(word >> (8 * index) & 0xFFU);
  return bytes;
}

// As a machine of the other byte order would have written the catalogue.
std::string withReversedWords(std::string bytes, std::size_t words) {
  for (std::size_t word = 0; word < words; ++word) {
    std::swap(bytes[4 * word], bytes[4 * word + 3]);
    std::swap(bytes[4 * word + 1], bytes[4 * word + 2]);
  }
  return bytes;
}

}  // namespace

TEST(ACompiledCatalogue, HoldsItsTexts) {
  EXPECT_THAT(catalogueTexts(catalogueBytes({})), Optional(ElementsAre(Key(""))));
  EXPECT_THAT(catalogueTexts(catalogueBytes({{"KEY", ""}, {"OTHER", "Ä"}})),
              Optional(ElementsAre(Key(""), Pair("KEY", ""), Pair("OTHER", "Ä"))));
  EXPECT_THAT(catalogueTexts(compiledBytes()), Optional(Contains(Pair("FAREWELL", "Auf Wiedersehen"))));
}

TEST(ACompiledCatalogue, MayBeOfEitherByteOrder) {
  const std::string bytes = catalogueBytes({{"KEY", "text"}});
  EXPECT_EQ(catalogueTexts(withReversedWords(bytes, 7 + 8)), catalogueTexts(bytes));
}

TEST(ACompiledCatalogue, GivesTheFirstOfSeveralNumbers) {
  const std::string several("KEY\0KEYS", 8);
  EXPECT_THAT(catalogueTexts(catalogueBytes({{several, std::string("one\0many", 8)}})), Optional(Contains(Pair("KEY", "one"))));
}

TEST(ACompiledCatalogue, MustBeInUtf8) {
  const struct {
    const char* header;
    bool isTaken;
  } cases[] = {{"Content-Type: text/plain; charset=UTF-8\n", true},
               {"Content-Type: text/plain; charset=utf-8\n", true},
               {"Content-Type: text/plain; charset=ISO-8859-1\n", false},
               {"", false}};
  for (const auto& [header, isTaken] : cases) {
    EXPECT_EQ(catalogueTexts(catalogueBytes({{"", header}})).has_value(), isTaken) << header;
  }
}

TEST(ACatalogueThatWasCutOff, IsRefusedAtEveryLength) {
  const std::string bytes = compiledBytes();
  ASSERT_THAT(bytes, Not(IsEmpty()));
  for (std::size_t length = 0; length < bytes.size(); ++length) {
    EXPECT_FALSE(catalogueTexts(bytes.substr(0, length))) << length;
  }
}

TEST(ACatalogueWithAFalseHeader, IsRefused) {
  const std::string bytes = catalogueBytes({{"KEY", "text"}});
  const struct {
    const char* what;
    std::size_t offset;
    std::uint32_t word;
  } cases[] = {
      {"magic number", 0, 0x12345678},
      {"count", 8, 1000},
      {"largest count", 8, 0xFFFFFFFF},
      {"key table", 12, 10'000},
      {"text table", 16, 0xFFFFFFFC},
      {"length of the key", 36, 100},
      {"greatest length of the key", 36, 0xFFFFFFFF},
      {"place of the key", 40, 0x7FFFFFF},
      {"a key without an end", 36, 2},
  };
  for (const auto& [what, offset, word] : cases) {
    EXPECT_FALSE(catalogueTexts(withWord(bytes, offset, word))) << what;
  }
}

TEST(ACatalogueFile, IsEmptyUnlessItIsAWellFormedFile) {
  EXPECT_THAT(readCatalogue(compiledCatalogue()), Not(IsEmpty()));
  EXPECT_THAT(readCatalogue(compiledCatalogue().parent_path()), IsEmpty());
  EXPECT_THAT(readCatalogue(compiledCatalogue().parent_path() / "Other.mo"), IsEmpty());
  EXPECT_THAT(readCatalogue("/dev/zero"), IsEmpty());
  EXPECT_THAT(readCatalogue(__FILE__), IsEmpty());
}
