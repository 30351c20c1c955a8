// Dictionaries keep the order in which keys were first set, and compare without it.

#include <gmock/gmock.h>

#include "Platform/Value.h"

namespace palisade {
namespace {

using ::testing::ElementsAre;
using ::testing::IsNull;
using ::testing::Pair;
using ::testing::Pointee;

std::vector<Dictionary::Entry> entriesOf(const Dictionary& dictionary) { return {dictionary.begin(), dictionary.end()}; }

TEST(ADictionary, IsEmptyUntilAKeyIsSet) {
  Dictionary dictionary;
  EXPECT_TRUE(dictionary.empty());
  EXPECT_EQ(dictionary.size(), 0u);
  EXPECT_EQ(dictionary.begin(), dictionary.end());

  dictionary.set("key", nullptr);

  EXPECT_FALSE(dictionary.empty());
  EXPECT_EQ(dictionary.size(), 1u);
}

TEST(ADictionary, EnumeratesItsKeysInTheOrderInWhichTheyWereFirstSet) {
  Dictionary dictionary{{"zebra", 1}, {"apple", 2}};
  dictionary.set("mango", 3);

  EXPECT_THAT(entriesOf(dictionary), ElementsAre(Pair("zebra", Value(1)), Pair("apple", Value(2)), Pair("mango", Value(3))));
}

TEST(AKeyThatIsSetAgain, KeepsItsPlaceAndTakesTheLaterValue) {
  Dictionary dictionary{{"zebra", 1}, {"apple", 2}};
  dictionary.set("zebra", "later");

  EXPECT_THAT(entriesOf(dictionary), ElementsAre(Pair("zebra", Value("later")), Pair("apple", Value(2))));
}

TEST(AKeyThatStandsTwiceInAList, KeepsItsPlaceAndTakesTheLaterValue) {
  EXPECT_THAT(entriesOf({{"a", 1}, {"b", 2}, {"a", 3}}), ElementsAre(Pair("a", Value(3)), Pair("b", Value(2))));
}

TEST(ALookUp, FindsTheValueOfExactlyThatKey) {
  const Dictionary dictionary{{"key", "value"}, {std::string("nul\0inside", 10), 1}, {"", 2}};

  EXPECT_THAT(dictionary.find("key"), Pointee(Value("value")));
  EXPECT_THAT(dictionary.find(std::string_view("nul\0inside", 10)), Pointee(Value(1)));
  EXPECT_THAT(dictionary.find(""), Pointee(Value(2)));
  for (const char* key : {"Key", "key ", "nul"}) EXPECT_THAT(dictionary.find(key), IsNull()) << key;
}

TEST(ANullThatWasSet, IsFoundAndAKeyThatWasNeverSetIsNot) {
  const Dictionary dictionary{{"null", nullptr}};

  EXPECT_THAT(dictionary.find("null"), Pointee(Value()));
  EXPECT_THAT(dictionary.find("absent"), IsNull());
}

TEST(TwoDictionaries, AreEqualInWhateverOrderTheirKeysWereSet) {
  EXPECT_EQ((Dictionary{{"a", 1}, {"b", 2}}), (Dictionary{{"b", 2}, {"a", 1}}));
}

TEST(TwoDictionaries, DifferByAKeyByAValueAndByTheirSize) {
  const Dictionary dictionary{{"a", 1}, {"b", 2}};

  EXPECT_NE(dictionary, (Dictionary{{"a", 1}, {"c", 2}}));
  EXPECT_NE(dictionary, (Dictionary{{"a", 1}, {"b", 3}}));
  EXPECT_NE(dictionary, (Dictionary{{"a", 1}}));
  EXPECT_NE((Dictionary{{"a", 1}}), dictionary);
}

TEST(ACopiedDictionary, ChangesApartFromTheOriginal) {
  Dictionary original{{"a", Dictionary{{"inner", 1}}}};
  Dictionary copy = original;
  copy.set("a", "changed");
  copy.set("b", 2);

  EXPECT_EQ(original, (Dictionary{{"a", Dictionary{{"inner", 1}}}}));
  EXPECT_THAT(entriesOf(copy), ElementsAre(Pair("a", Value("changed")), Pair("b", Value(2))));
}

TEST(AnAssignedDictionary, HoldsWhatItWasGivenAndNothingOfWhatItHeld) {
  Dictionary copied{{"old", 1}};
  Dictionary moved{{"old", 1}};
  const Dictionary given{{"new", 2}};
  copied = given;
  moved = Dictionary{{"new", 2}};

  for (const Dictionary* dictionary : {&copied, &moved}) {
    EXPECT_EQ(*dictionary, given);
    EXPECT_THAT(dictionary->find("old"), IsNull());
  }
}

}  // namespace
}  // namespace palisade
