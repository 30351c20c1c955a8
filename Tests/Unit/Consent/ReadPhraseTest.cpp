// The reading phrase: the user's own objects and the friends' objects, each side a list of its own.

#include <gmock/gmock.h>

#include "Tests/Unit/Consent/ConsentScene.h"
#include "Tests/Unit/Consent/KnownPermissions.h"

namespace palisade {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;
using ::testing::Optional;

class TheReadPhrase : public ::testing::Test, protected ConsentScene {
 protected:
  std::optional<std::string> phrase(const PermissionSet& permissions) const {
    return plugin->_predicateForPermissions(permissions, "extended-read", std::nullopt);
  }
};

const std::string basicsAndFriendList =
    shown("ACCOUNT_ACCESS_EXTENDED_READ_USER_MULTIPLE", {readName("BASIC_PROFILE"), readName("FRIENDS")});

TEST_F(TheReadPhrase, OfAnyBasicPermissionNamesTheBasicProfileAndTheFriendList) {
  for (const std::string& permission : known::basicRead) {
    EXPECT_THAT(phrase({permission}), Optional(shown("ACCOUNT_ACCESS_EXTENDED_READ", {basicsAndFriendList}))) << permission;
  }
  EXPECT_THAT(phrase({known::basicRead.begin(), known::basicRead.end()}),
              Optional(shown("ACCOUNT_ACCESS_EXTENDED_READ", {basicsAndFriendList})));
}

TEST_F(TheReadPhrase, OfEmailAndAboutMeNamesAboutMeOnly) {
  EXPECT_THAT(phrase({"email", "user_about_me"}),
              Optional(shown("ACCOUNT_ACCESS_EXTENDED_READ",
                             {shown("ACCOUNT_ACCESS_EXTENDED_READ_USER", {readName("USER_ABOUT_ME")})})));
}

TEST_F(TheReadPhrase, LeavesTheBasicsOutForEveryPermissionOfTheUserProfile) {
  for (const std::string& permission : known::userProfile) {
    const auto whole = phrase({"basic_info", "friends", permission});
    ASSERT_TRUE(whole.has_value());
    EXPECT_THAT(*whole, Not(HasSubstr("BASIC_PROFILE"))) << permission;
    EXPECT_THAT(*whole, Not(HasSubstr(readName("FRIENDS")))) << permission;
  }
}

TEST_F(TheReadPhrase, KeepsTheBasicsBesideEveryOtherReadPermission) {
  for (const std::string& permission : known::extendedRead()) {
    if (std::ranges::find(known::userProfile, permission) != known::userProfile.end()) continue;
    EXPECT_THAT(phrase({"email", permission}), Optional(HasSubstr(readName("BASIC_PROFILE")))) << permission;
  }
}

TEST_F(TheReadPhrase, OfFriendsLikesNamesTheFriendsSideAlone) {
  EXPECT_THAT(phrase({"friends_likes"}),
              Optional(shown("ACCOUNT_ACCESS_EXTENDED_READ",
                             {shown("ACCOUNT_ACCESS_EXTENDED_READ_FRIENDS", {readName("FRIENDS_LIKES")})})));
}

TEST_F(TheReadPhrase, OfBothSidesNamesTheUsersSideFirst) {
  EXPECT_THAT(phrase({"friends_likes", "user_likes"}),
              Optional(shown("ACCOUNT_ACCESS_EXTENDED_READ_MULTIPLE",
                             {shown("ACCOUNT_ACCESS_EXTENDED_READ_USER", {readName("USER_LIKES")}),
                              shown("ACCOUNT_ACCESS_EXTENDED_READ_FRIENDS", {readName("FRIENDS_LIKES")})})));
}

TEST_F(TheReadPhrase, LeadsWithTheBasicsAndEndsWithTheLastObject) {
  EXPECT_THAT(phrase({"user_videos", "email", "user_photos"}),
              Optional(shown("ACCOUNT_ACCESS_EXTENDED_READ",
                             {shown("ACCOUNT_ACCESS_EXTENDED_READ_USER_MULTIPLE",
                                    {separated({readName("BASIC_PROFILE"), readName("FRIENDS"), readName("USER_PHOTOS")}),
                                     readName("USER_VIDEOS")})})));
}

TEST_F(TheReadPhrase, PutsWhatTheUserSeesOfTheWallAmongTheUsersObjects) {
  for (const std::string& permission : known::loneRead) {
    EXPECT_THAT(phrase({permission}),
                Optional(shown("ACCOUNT_ACCESS_EXTENDED_READ",
                               {shown("ACCOUNT_ACCESS_EXTENDED_READ_USER", {readName(known::upperCased(permission))})})));
  }
}

TEST_F(TheReadPhrase, OfAllFiftyFivePermissionsNamesTheUsersObjectsAndTheFriends) {
  const auto read = known::read();
  const auto whole = phrase({read.begin(), read.end()});

  ASSERT_TRUE(whole.has_value());
  for (const std::string& permission : known::extendedRead()) {
    EXPECT_THAT(*whole, HasSubstr(readName(known::upperCased(permission))));
  }
  const auto userSide = whole->find("ACCOUNT_ACCESS_EXTENDED_READ_USER_MULTIPLE<");
  const auto friendsSide = whole->find("ACCOUNT_ACCESS_EXTENDED_READ_FRIENDS_MULTIPLE<");
  EXPECT_LT(userSide, friendsSide);
  EXPECT_NE(friendsSide, std::string::npos);
}

TEST_F(TheReadPhrase, OfNothingReadableIsNone) {
  EXPECT_EQ(phrase({}), std::nullopt);
  EXPECT_EQ(phrase({"publish", "manage_pages", "new_thing", "user_zebra", "basic_profile"}), std::nullopt);
}

TEST_F(TheReadPhrase, IsTheSameForBothReadCategories) {
  for (const PermissionSet& permissions :
       {PermissionSet{}, PermissionSet{"email"}, PermissionSet{"user_likes", "friends_likes"}, PermissionSet{"new_thing"}}) {
    EXPECT_EQ(plugin->_predicateForPermissions(permissions, "basic-read", std::nullopt),
              plugin->_predicateForPermissions(permissions, "extended-read", std::nullopt));
  }
}

TEST_F(TheReadPhrase, DoesNotDependOnTheAudience) {
  EXPECT_EQ(plugin->_predicateForPermissions({"user_likes"}, "extended-read", std::string(FacebookAudienceOnlyMe)),
            phrase({"user_likes"}));
}

TEST_F(TheReadPhrase, DoesNotDependOnTheOrderInWhichPermissionsWereAskedFor) {
  std::vector<std::string> names = known::read();
  const auto expected = phrase({names.begin(), names.end()});
  for (int round = 0; round < 20; ++round) {
    std::ranges::rotate(names, names.begin() + 7);
    PermissionSet permissions;
    permissions.rehash(static_cast<std::size_t>(round) * 31);
    for (const std::string& name : names) permissions.insert(name);
    EXPECT_EQ(phrase(permissions), expected);
  }
}

TEST_F(TheReadPhrase, LooksUpTheUsersSideBeforeTheFriendsAndWhatItNeedsOnly) {
  phrase({"user_likes", "friends_likes"});

  std::vector<std::string> keys;
  for (const auto& lookup : platform.strings.lookups()) keys.push_back(lookup.key);
  EXPECT_THAT(keys, ElementsAre("FACEBOOK_READ_PERMISSION_USER_LIKES", "ACCOUNT_ACCESS_EXTENDED_READ_USER",
                                "FACEBOOK_READ_PERMISSION_FRIENDS_LIKES", "ACCOUNT_ACCESS_EXTENDED_READ_FRIENDS",
                                "ACCOUNT_ACCESS_EXTENDED_READ_MULTIPLE"));
}

using TheUsersObjects = TheReadPhrase;

TEST_F(TheUsersObjects, AreNoneWithoutAnObjectOfTheUser) {
  for (const PermissionSet& permissions : {PermissionSet{}, PermissionSet{"friends_likes", "publish", "user_zebra"}}) {
    EXPECT_EQ(plugin->_userObjectsRequestedByPermissions(permissions), std::nullopt);
  }
}

TEST_F(TheUsersObjects, AreListedInTheOrderOfTheirNames) {
  EXPECT_THAT(plugin->_userObjectsRequestedByPermissions({"read_stream", "user_likes", "user_events", "friends_events"}),
              Optional(shown("ACCOUNT_ACCESS_EXTENDED_READ_USER_MULTIPLE",
                             {separated({readName("READ_STREAM"), readName("USER_EVENTS")}), readName("USER_LIKES")})));
}

using TheFriendsObjects = TheReadPhrase;

TEST_F(TheFriendsObjects, AreNoneWithoutAnObjectOfTheFriends) {
  for (const PermissionSet& permissions :
       {PermissionSet{}, PermissionSet{"friends"}, PermissionSet{"user_likes", "Friends_likes", "my_friends_likes"}}) {
    EXPECT_EQ(plugin->_friendObjectsRequestedByPermissions(permissions), std::nullopt);
  }
}

TEST_F(TheFriendsObjects, IncludeWhatIsInNoListWhenACallerPassesItIn) {
  EXPECT_THAT(plugin->_friendObjectsRequestedByPermissions({"friends_zebra"}),
              Optional(shown("ACCOUNT_ACCESS_EXTENDED_READ_FRIENDS", {readName("FRIENDS_ZEBRA")})));
  EXPECT_THAT(plugin->_friendObjectsRequestedByPermissions({"friends_"}),
              Optional(shown("ACCOUNT_ACCESS_EXTENDED_READ_FRIENDS", {readName("FRIENDS_")})));
}

TEST_F(TheFriendsObjects, AreListedInTheOrderOfTheirNames) {
  EXPECT_THAT(
      plugin->_friendObjectsRequestedByPermissions({"friends_videos", "friends_events", "friends_likes", "friends"}),
      Optional(shown("ACCOUNT_ACCESS_EXTENDED_READ_FRIENDS_MULTIPLE",
                     {separated({readName("FRIENDS_EVENTS"), readName("FRIENDS_LIKES")}), readName("FRIENDS_VIDEOS")})));
}

TEST_F(TheReadPhrase, LeavesNothingInTheLog) {
  phrase({"user_likes", "new_thing"});
  EXPECT_THAT(platform.trace.events(), IsEmpty());
}

}  // namespace
}  // namespace palisade
