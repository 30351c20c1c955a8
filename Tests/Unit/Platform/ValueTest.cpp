// Values tell every type apart, because a caller's type decides what a request means.

#include "Platform/Value.h"

#include <gmock/gmock.h>

#include <cstdint>
#include <limits>

namespace palisade {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::IsNull;
using ::testing::NotNull;
using ::testing::Pointee;

enum class Kind { null, boolean, integer, largeInteger, real, string, array, dictionary };

struct ValueOfKind {
  Value value;
  Kind kind;
  bool isNumber;
};

const ValueOfKind oneOfEachKind[] = {
    {.value = nullptr, .kind = Kind::null, .isNumber = false},
    {.value = false, .kind = Kind::boolean, .isNumber = false},
    {.value = 0, .kind = Kind::integer, .isNumber = true},
    {.value = std::uint64_t{1} << 63, .kind = Kind::largeInteger, .isNumber = true},
    {.value = 0.0, .kind = Kind::real, .isNumber = true},
    {.value = "", .kind = Kind::string, .isNumber = false},
    {.value = Array(), .kind = Kind::array, .isNumber = false},
    {.value = Dictionary(), .kind = Kind::dictionary, .isNumber = false},
};

TEST(AValue, AnswersToTheGetterOfItsOwnTypeAndToNoOther) {
  for (const auto& [value, kind, isNumber] : oneOfEachKind) {
    SCOPED_TRACE(static_cast<int>(kind));
    EXPECT_EQ(value.isNull(), kind == Kind::null);
    EXPECT_EQ(value.boolean() != nullptr, kind == Kind::boolean);
    EXPECT_EQ(value.integer() != nullptr, kind == Kind::integer);
    EXPECT_EQ(value.largeInteger() != nullptr, kind == Kind::largeInteger);
    EXPECT_EQ(value.real() != nullptr, kind == Kind::real);
    EXPECT_EQ(value.string() != nullptr, kind == Kind::string);
    EXPECT_EQ(value.array() != nullptr, kind == Kind::array);
    EXPECT_EQ(value.dictionary() != nullptr, kind == Kind::dictionary);
    EXPECT_EQ(value.isNumber(), isNumber);
  }
}

TEST(AValue, EqualsNoValueOfAnotherTypeHoweverAlikeTheyLook) {
  for (const ValueOfKind& one : oneOfEachKind) {
    for (const ValueOfKind& other : oneOfEachKind) EXPECT_EQ(one.value == other.value, one.kind == other.kind);
  }
}

TEST(AValue, IsNullUnlessItWasGivenSomething) { EXPECT_TRUE(Value().isNull()); }

TEST(AValue, HoldsWhatItWasMadeOf) {
  EXPECT_THAT(Value(true).boolean(), Pointee(true));
  EXPECT_THAT(Value(-7).integer(), Pointee(-7));
  EXPECT_THAT(Value(2.5).real(), Pointee(2.5));
  EXPECT_THAT(Value(std::string("a\0b", 3)).string(), Pointee(std::string("a\0b", 3)));
  EXPECT_THAT(Value(std::string_view("email")).string(), Pointee(std::string("email")));
  EXPECT_THAT(Value(Array{1, "two"}).array(), Pointee(ElementsAre(Value(1), Value("two"))));
}

TEST(AValueOfALiteral, IsTextAndNotABoolean) {
  EXPECT_THAT(Value("yes").string(), Pointee(std::string("yes")));
  EXPECT_THAT(Value("yes").boolean(), IsNull());
}

TEST(AnUnsignedNumber, IsHeldSignedAsFarAsThatGoes) {
  EXPECT_THAT(Value(std::uint64_t{5}).integer(), Pointee(5));
  EXPECT_EQ(Value(std::uint64_t{5}), Value(5));
  EXPECT_THAT(Value(static_cast<std::uint64_t>(INT64_MAX)).integer(), Pointee(INT64_MAX));
}

TEST(AnUnsignedNumber, KeepsItsDigitsBeyondTheSignedRange) {
  const auto firstBeyond = static_cast<std::uint64_t>(INT64_MAX) + 1;
  EXPECT_THAT(Value(firstBeyond).largeInteger(), Pointee(firstBeyond));
  EXPECT_THAT(Value(UINT64_MAX).largeInteger(), Pointee(UINT64_MAX));
  EXPECT_THAT(Value(UINT64_MAX).integer(), IsNull());
}

TEST(ACopiedValue, SharesNothingWithTheOriginal) {
  Value original(Dictionary{{"list", Array{"a", Dictionary{{"deep", 1}}}}});
  const Value copy = original;

  original = nullptr;

  ASSERT_THAT(copy.dictionary(), NotNull());
  EXPECT_EQ(copy, Value(Dictionary{{"list", Array{"a", Dictionary{{"deep", 1}}}}}));
}

TEST(TwoArrays, AreEqualOnlyInTheSameOrder) {
  EXPECT_EQ(Value(Array{1, 2}), Value(Array{1, 2}));
  EXPECT_NE(Value(Array{1, 2}), Value(Array{2, 1}));
  EXPECT_NE(Value(Array{1}), Value(Array{1, 1}));
}

TEST(TheStringsOfAnArray, AreVisitedInOrderAndElementsOfAnotherTypeArePassedOver) {
  std::vector<std::string> visited;
  forEachString(Array{nullptr, "email", 1, "", Array{"nested"}, Dictionary{{"user_likes", "x"}}, true, "email"},
                [&](const std::string& text) { visited.push_back(text); });

  EXPECT_THAT(visited, ElementsAre("email", "", "email"));
}

TEST(TheStringsOfAnArray, AreNoneInAnEmptyOne) {
  std::vector<std::string> visited;
  forEachString(Array(), [&](const std::string& text) { visited.push_back(text); });

  EXPECT_THAT(visited, IsEmpty());
}

}  // namespace
}  // namespace palisade
