// Lists of object names, the keys that are formed for them, and how texts that are missing, alike or full of "%" are used.

#include <gmock/gmock.h>

#include "Tests/Unit/Consent/ConsentScene.h"

namespace palisade {
namespace {

using ::testing::Each;
using ::testing::Field;
using ::testing::Optional;

class AnObjectList : public ::testing::Test, protected ConsentScene {
 protected:
  std::string list(const ObjectNames& names) const {
    return plugin->_commaSeparatedListWithFormat("ACCOUNT_ACCESS_EXTENDED_READ_USER", names);
  }
};

std::string several(std::string allButLast, std::string last) {
  return shown("ACCOUNT_ACCESS_EXTENDED_READ_USER_MULTIPLE", {std::move(allButLast), std::move(last)});
}

const std::string basicProfile = readName("BASIC_PROFILE");
const std::string friendList = readName("FRIENDS");

TEST_F(AnObjectList, OfOneNameUsesTheKeyItself) {
  EXPECT_EQ(list({"likes"}), shown("ACCOUNT_ACCESS_EXTENDED_READ_USER", {"likes"}));
  EXPECT_EQ(list({friendList}), shown("ACCOUNT_ACCESS_EXTENDED_READ_USER", {friendList}));
}

TEST_F(AnObjectList, OfTwoNamesFillsOneInEach) { EXPECT_EQ(list({"b", "a"}), several("a", "b")); }

TEST_F(AnObjectList, OfThreeNamesJoinsTheFirstTwo) { EXPECT_EQ(list({"c", "a", "b"}), several(separated({"a", "b"}), "c")); }

TEST_F(AnObjectList, LeadsWithTheBasicProfileAndThenTheFriendListWhateverElseIsNamed) {
  EXPECT_EQ(list({"A", basicProfile, "z", friendList}), several(separated({basicProfile, friendList, "A"}), "z"));
  EXPECT_EQ(list({"A", basicProfile}), several(basicProfile, "A"));
  EXPECT_EQ(list({"A", friendList}), several(friendList, "A"));
}

TEST_F(AnObjectList, EndsWithTheFriendListWhenNothingElseFollows) {
  EXPECT_EQ(list({friendList, basicProfile}), several(basicProfile, friendList));
}

TEST_F(AnObjectList, NamesATextTwiceThatStandsForBasicProfileAndFriendList) {
  platform.strings.set("FACEBOOK_READ_PERMISSION_BASIC_PROFILE", "you");
  platform.strings.set("FACEBOOK_READ_PERMISSION_FRIENDS", "you");

  EXPECT_EQ(list({"you", "photos"}), several(separated({"you", "you"}), "photos"));
}

TEST_F(AnObjectList, CopiesNamesAndASeparatorThatLookLikeFormats) {
  platform.strings.set("WORD_LIST_SEPARATOR", " %@ ");

  EXPECT_EQ(list({"%@", "%d", "%s"}), several("%@ %@ %d", "%s"));
}

TEST_F(AnObjectList, FormsTheKeyForSeveralNamesFromTheKeyForOne) {
  platform.strings.set("ANYTHING", "one: %@");
  platform.strings.set("ANYTHING_MULTIPLE", "several: %@ / %@");

  EXPECT_EQ(plugin->_commaSeparatedListWithFormat("ANYTHING", {"a"}), "one: a");
  EXPECT_EQ(plugin->_commaSeparatedListWithFormat("ANYTHING", {"a", "b"}), "several: a / b");
  EXPECT_EQ(plugin->_commaSeparatedListWithFormat("ANYTHING", {}), "several:  / ");
}

class AnObjectName : public ::testing::Test, protected ConsentScene {};

TEST_F(AnObjectName, HasTheWholePermissionInUpperCaseInItsKey) {
  const std::pair<const char*, const char*> keys[] = {
      {"user_likes", "USER_LIKES"},
      {"friends_likes", "FRIENDS_LIKES"},
      {"read_stream", "READ_STREAM"},
      {"friends", "FRIENDS"},
      {"basic_profile", "BASIC_PROFILE"},
      {"a1_z9", "A1_Z9"},
      {"ALREADY_UPPER", "ALREADY_UPPER"},
      {"", ""},
      {"%@", "%@"},
      {"käse{z`", "KäSE{Z`"},
  };
  for (const auto& [permission, inKey] : keys) {
    EXPECT_EQ(plugin->_objectNameForReadPermission(permission), readName(inKey));
    EXPECT_EQ(plugin->_objectNameForManagePermission(permission), manageName(inKey));
  }
}

class EveryText : public ::testing::Test, protected ConsentScene {};

TEST_F(EveryText, IsLookedUpInTheTableLocalizableWithTheEmptyTextToFallBackOn) {
  serverDescribes(R"("new things")");
  message({"email", "user_likes", "friends_likes", "friends_videos", "publish", "manage_pages", "create_event", "new_thing"});

  EXPECT_THAT(platform.strings.lookups(), Each(Field(&FakeStringTable::Lookup::tableName, "Localizable")));
  EXPECT_THAT(platform.strings.lookups(), Each(Field(&FakeStringTable::Lookup::defaultValue, "")));
}

TEST_F(EveryText, IsLookedUpAfreshEachTime) {
  platform.strings.set("FACEBOOK_READ_PERMISSION_USER_LIKES", "likes");
  EXPECT_EQ(plugin->_objectNameForReadPermission("user_likes"), "likes");

  platform.strings.set("FACEBOOK_READ_PERMISSION_USER_LIKES", "Gefällt mir");
  EXPECT_EQ(plugin->_objectNameForReadPermission("user_likes"), "Gefällt mir");
}

// A platform whose table holds nothing answers the empty text for every key.
class AMissingText : public ::testing::Test, protected ConsentScene {
 protected:
  AMissingText() : ConsentScene(photosClient(), nullptr) {}
};

TEST_F(AMissingText, IsTheEmptyTextAndStillMakesAPhrase) {
  EXPECT_THAT(plugin->_predicateForPermissions({"email", "user_likes", "friends_likes"}, "extended-read", std::nullopt),
              Optional(std::string()));
  EXPECT_THAT(plugin->_predicateForPermissions({"publish"}, "write", std::nullopt), Optional(std::string()));
  EXPECT_THAT(plugin->_predicateForPermissions({"manage_pages"}, "manage", std::nullopt), Optional(std::string()));
}

TEST_F(AMissingText, OfANameIsANameLikeAnyOther) {
  platform.strings.set("ACCOUNT_ACCESS_EXTENDED_READ_USER", "one:%@.");
  platform.strings.set("ACCOUNT_ACCESS_EXTENDED_READ_USER_MULTIPLE", "several:%@ and %@.");
  platform.strings.set("FACEBOOK_READ_PERMISSION_USER_VIDEOS", "videos");
  platform.strings.set("WORD_LIST_SEPARATOR", ", ");

  EXPECT_THAT(plugin->_userObjectsRequestedByPermissions({"user_likes", "user_photos"}), Optional(std::string("one:.")));
  EXPECT_THAT(plugin->_userObjectsRequestedByPermissions({"email"}), Optional(std::string("one:.")));
  EXPECT_THAT(plugin->_userObjectsRequestedByPermissions({"user_likes", "user_videos"}),
              Optional(std::string("several:,  and videos.")));
}

TEST_F(AMissingText, OfTheSeparatorRunsTheNamesTogether) {
  platform.strings.set("ACCOUNT_ACCESS_MANAGE_MULTIPLE", "%@ and %@");
  platform.strings.set("FACEBOOK_MANAGE_PERMISSION_CREATE_EVENT", "a");
  platform.strings.set("FACEBOOK_MANAGE_PERMISSION_RSVP_EVENT", "b");
  platform.strings.set("FACEBOOK_MANAGE_PERMISSION_XMPP_LOGIN", "c");

  EXPECT_THAT(plugin->_predicateForPermissions({"create_event", "rsvp_event", "xmpp_login"}, "manage", std::nullopt),
              Optional(std::string("ab and c")));
}

TEST_F(AMissingText, OfASentenceIsAnEmptyMessageAndNotNone) {
  EXPECT_THAT(message({"email"}), Optional(std::string()));
  EXPECT_THAT(message({}), Optional(std::string()));
}

class AFormatFromATranslator : public ::testing::Test, protected ConsentScene {};

TEST_F(AFormatFromATranslator, KeepsEveryPercentSignThatIsNoPlaceholder) {
  platform.strings.set("ACCOUNT_ACCESS_MANAGE", "100% %d %% %s %1$@ %@");

  EXPECT_THAT(plugin->_predicateForPermissions({"manage_pages"}, "manage", std::nullopt),
              Optional("100% %d %% %s %1$@ " + manageName("MANAGE_PAGES")));
}

TEST_F(AFormatFromATranslator, WithoutItsPlaceholdersLosesTheArguments) {
  platform.strings.set("ACCOUNT_ACCESS_EXTENDED_READ", "see things");

  EXPECT_THAT(plugin->_predicateForPermissions({"user_likes"}, "extended-read", std::nullopt),
              Optional(std::string("see things")));
}

TEST_F(AFormatFromATranslator, WithSurplusPlaceholdersLeavesThemEmpty) {
  platform.strings.set("ACCOUNT_ACCESS_EXTENDED_READ", "see %@[%@]");
  platform.strings.set("ACCOUNT_ACCESS_EXTENDED_READ_USER", "%@");
  platform.strings.set("FACEBOOK_READ_PERMISSION_USER_LIKES", "likes %@");

  EXPECT_THAT(plugin->_predicateForPermissions({"user_likes"}, "extended-read", std::nullopt),
              Optional(std::string("see likes %@[]")));
}

}  // namespace
}  // namespace palisade
