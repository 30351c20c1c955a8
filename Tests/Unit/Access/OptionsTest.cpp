// How the options of a client are read and judged, and what a grant keeps of them.

#include <limits>
#include <ostream>
#include <string>
#include <vector>

#include <gmock/gmock.h>

#include "Tests/Unit/Access/OptionKeys.h"
#include "Tests/Unit/Support/Scene.h"

namespace palisade {
namespace {

using ::testing::AnyOf;
using ::testing::IsEmpty;
using ::testing::UnorderedElementsAre;

// One value of every type that is not a string and not an array.
const std::vector<Value> valuesOfOtherTypes = {
    nullptr,      true,
    false,        0,
    -1,           std::numeric_limits<std::uint64_t>::max(),
    0.0,          1.5,
    Dictionary{}, Dictionary{{permissionsKey, Array{"publish"}}},
};

class TheOptions : public ::testing::Test {
 protected:
  bool areValid(const Dictionary& options) const { return _scene.plugin->_validateOptionsDictionary(&options); }

  std::optional<std::string> appIDOf(const Dictionary& options) const {
    return _scene.plugin->_appIDFromOptionsDictionary(&options);
  }
  PermissionSet permissionsOf(const Dictionary& options) const {
    return _scene.plugin->_permissionsFromOptionsDictionary(&options);
  }
  std::optional<std::string> audienceOf(const Dictionary& options) const {
    return _scene.plugin->_audienceFromOptionsDictionary(&options);
  }
  Dictionary persistentOf(const Dictionary& options) const { return *_scene.plugin->_persistentDictionaryForOptions(&options); }

  Scene _scene;
};

TEST_F(TheOptions, AreInvalidAndReadAsEmptyWhenThereAreNone) {
  EXPECT_FALSE(_scene.plugin->_validateOptionsDictionary(nullptr));
  EXPECT_EQ(_scene.plugin->_appIDFromOptionsDictionary(nullptr), std::nullopt);
  EXPECT_THAT(_scene.plugin->_permissionsFromOptionsDictionary(nullptr), IsEmpty());
  EXPECT_EQ(_scene.plugin->_audienceFromOptionsDictionary(nullptr), std::nullopt);
  EXPECT_EQ(*_scene.plugin->_persistentDictionaryForOptions(nullptr), Dictionary());
}

TEST_F(TheOptions, AreInvalidAndReadAsEmptyWhenTheyHoldNothing) {
  EXPECT_FALSE(areValid({}));
  EXPECT_EQ(appIDOf({}), std::nullopt);
  EXPECT_THAT(permissionsOf({}), IsEmpty());
  EXPECT_EQ(audienceOf({}), std::nullopt);
  EXPECT_EQ(persistentOf({}), Dictionary());
}

TEST_F(TheOptions, NeedAnAppIDThatIsNotEmpty) {
  EXPECT_FALSE(areValid({{appIDKey, ""}}));
  EXPECT_EQ(appIDOf({{appIDKey, ""}}), "");
  EXPECT_FALSE(areValid({{permissionsKey, Array{"email"}}, {audienceKey, FacebookAudienceEveryone}}));
  EXPECT_FALSE(areValid({{"facebookappidkey", "1"}}));
}

TEST_F(TheOptions, TakeAnyAppIDThatIsNotEmpty) {
  using namespace std::string_literals;
  for (const std::string& appID : {"1"s, " "s, "%@"s, "\0"s, "\n"s, "\xff\xfe"s, std::string(100000, 'x')}) {
    EXPECT_TRUE(areValid({{appIDKey, appID}}));
    EXPECT_EQ(appIDOf({{appIDKey, appID}}), appID);
  }
}

TEST_F(TheOptions, AreInvalidWithAnAppIDThatIsNoString) {
  for (const Value& appID : valuesOfOtherTypes) {
    EXPECT_FALSE(areValid({{appIDKey, appID}})) << compactJson(appID);
    EXPECT_EQ(appIDOf({{appIDKey, appID}}), std::nullopt) << compactJson(appID);
  }
  EXPECT_FALSE(areValid({{appIDKey, Array{"1"}}}));
  EXPECT_FALSE(areValid({{appIDKey, 1234567890}}));
  EXPECT_EQ(appIDOf({{appIDKey, 1234567890}}), std::nullopt);
}

TEST_F(TheOptions, AreValidWithoutPermissionsAndWithoutAnAudience) {
  EXPECT_TRUE(areValid({{appIDKey, "1"}}));
  EXPECT_THAT(permissionsOf({{appIDKey, "1"}}), IsEmpty());
  EXPECT_TRUE(areValid({{appIDKey, "1"}, {permissionsKey, Array{}}}));
}

TEST_F(TheOptions, AreInvalidWithPermissionsThatAreNoArray) {
  std::vector<Value> values = valuesOfOtherTypes;
  values.insert(values.end(), {"email", "", "publish", "[\"email\"]"});
  for (const Value& permissions : values) {
    const Dictionary options{{appIDKey, "1"}, {permissionsKey, permissions}, {audienceKey, FacebookAudienceEveryone}};
    EXPECT_FALSE(areValid(options)) << compactJson(permissions);
    EXPECT_THAT(permissionsOf(options), IsEmpty()) << compactJson(permissions);
  }
}

TEST_F(TheOptions, TakeAnArrayOfAnyElementsAndReadItsStrings) {
  Array elements(valuesOfOtherTypes);
  elements.insert(elements.end(), {"user_likes", Array{"publish"}, Array{Array{"publish"}}, "", "user_likes"});
  const Dictionary options{{appIDKey, "1"}, {permissionsKey, elements}};
  EXPECT_TRUE(areValid(options)) << "What is no string is no write permission either.";
  EXPECT_THAT(permissionsOf(options), UnorderedElementsAre("user_likes", ""));
}

TEST_F(TheOptions, NamePermissionsOnceHoweverOftenTheyAreAskedFor) {
  EXPECT_THAT(permissionsOf({{permissionsKey, Array{"user_likes", "user_likes"}}}), UnorderedElementsAre("user_likes"));
}

TEST_F(TheOptions, NeedAnAudienceForEveryWritePermission) {
  for (const char* write : {"publish_actions", "publish_stream", "publish_checkins", "publish"}) {
    const Array permissions{"email", write, "manage_pages"};
    EXPECT_FALSE(areValid(optionsAskingFor(permissions))) << write;
    EXPECT_TRUE(areValid(optionsAskingFor(permissions, FacebookAudienceOnlyMe))) << write;
    EXPECT_TRUE(areValid(optionsAskingFor(permissions, "none of the three"))) << write;
    EXPECT_TRUE(areValid(optionsAskingFor(permissions, ""))) << write;
  }
}

TEST_F(TheOptions, AreInvalidWhenAWritePermissionMeetsAnAudienceThatIsNoString) {
  std::vector<Value> values = valuesOfOtherTypes;
  values.emplace_back(Array{FacebookAudienceEveryone});
  for (const Value& audience : values) {
    Dictionary options = optionsAskingFor({"publish"});
    options.set(audienceKey, audience);
    EXPECT_FALSE(areValid(options)) << compactJson(audience);
    EXPECT_EQ(audienceOf(options), std::nullopt) << compactJson(audience);
  }
}

TEST_F(TheOptions, AreValidWithAnyAudienceWhenNothingIsWritten) {
  std::vector<Value> values = valuesOfOtherTypes;
  values.insert(values.end(), {7, "anybody", Array{}});
  for (const Value& audience : values) {
    Dictionary options = optionsAskingFor({"email", "manage_pages", "Publish", "publish ", "future"});
    options.set(audienceKey, audience);
    EXPECT_TRUE(areValid(options)) << compactJson(audience);
  }
}

TEST_F(TheOptions, KeepAnAudienceOfAnotherTypeAsItStands) {
  Dictionary options = optionsAskingFor({"email"});
  options.set(audienceKey, 7);
  EXPECT_TRUE(areValid(options));
  EXPECT_EQ(audienceOf(options), std::nullopt);
  EXPECT_EQ(persistentOf(options), (Dictionary{{appIDKey, photosAppID}, {audienceKey, 7}}));
}

TEST_F(TheOptions, ReadAnAudienceOfAnyText) {
  EXPECT_EQ(audienceOf({{audienceKey, FacebookAudienceFriends}}), FacebookAudienceFriends);
  EXPECT_EQ(audienceOf({{audienceKey, ""}}), "");
  EXPECT_EQ(audienceOf({{audienceKey, "%@"}}), "%@");
}

TEST_F(TheOptions, LeaveAppIDAndAudienceToTheGrantAndNothingElse) {
  Dictionary options{{"further key", 1}, {audienceKey, FacebookAudienceFriends}, {permissionsKey, Array{"publish"}}};
  options.set(appIDKey, photosAppID);

  const Dictionary persistent = persistentOf(options);

  EXPECT_EQ(persistent, (Dictionary{{appIDKey, photosAppID}, {audienceKey, FacebookAudienceFriends}}));
  EXPECT_EQ(persistent.begin()->first, appIDKey) << "The app ID is set first.";
}

TEST_F(TheOptions, LeaveOnlyWhatTheyHold) {
  EXPECT_EQ(persistentOf({{appIDKey, "1"}}), (Dictionary{{appIDKey, "1"}}));
  EXPECT_EQ(persistentOf({{audienceKey, "a"}}), (Dictionary{{audienceKey, "a"}}));
  EXPECT_EQ(persistentOf({{permissionsKey, Array{"email"}}}), Dictionary());
}

TEST_F(TheOptions, LeaveValuesOfEveryTypeToTheGrantUntested) {
  for (const Value& value : valuesOfOtherTypes) {
    const Dictionary options{{appIDKey, value}, {audienceKey, value}};
    EXPECT_EQ(persistentOf(options), options) << compactJson(value);
  }
}

TEST_F(TheOptions, AreNotChangedByBeingRead) {
  const Dictionary original = optionsAskingFor({"publish", 7, nullptr}, FacebookAudienceFriends);
  const Dictionary options = original;
  areValid(options);
  permissionsOf(options);
  persistentOf(options);
  EXPECT_EQ(options, original);
}

TEST_F(TheOptions, AreJudgedByTheFlowAsByTheValidation) {
  std::vector<Value> values = valuesOfOtherTypes;
  values.insert(values.end(), {"text", Array{"publish"}});
  for (const std::string& key : {appIDKey, permissionsKey, audienceKey}) {
    for (const Value& value : values) {
      Dictionary options = optionsAskingFor({"publish"}, FacebookAudienceEveryone);
      options.set(key, value);
      Scene scene;
      scene.addAccount();
      const bool isValid = scene.plugin->_validateOptionsDictionary(&options);
      EXPECT_THAT(scene.requestAccess(options), isRefusalWith(accountsError(isValid ? 7 : 8)))
          << key << " = " << compactJson(value);
    }
  }
}

TEST(ACommaSeparatedList, IsEmptyForNoneAndForTheEmptySet) {
  const Scene scene;
  const PermissionSet empty;
  EXPECT_EQ(scene.plugin->_csvStringFromSet(nullptr), "");
  EXPECT_EQ(scene.plugin->_csvStringFromSet(&empty), "");
}

TEST(ACommaSeparatedList, JoinsTheElementsInTheSetsOwnOrder) {
  const Scene scene;
  const PermissionSet one{"email"};
  EXPECT_EQ(scene.plugin->_csvStringFromSet(&one), "email");

  const PermissionSet two{"email", "user_likes"};
  EXPECT_EQ(scene.plugin->_csvStringFromSet(&two), *two.begin() + "," + *std::next(two.begin()));
}

TEST(ACommaSeparatedList, QuotesNothing) {
  const Scene scene;
  const PermissionSet elements{"a,b", ""};
  EXPECT_THAT(scene.plugin->_csvStringFromSet(&elements), AnyOf("a,b,", ",a,b"));
}

}  // namespace
}  // namespace palisade
