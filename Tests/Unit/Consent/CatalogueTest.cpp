// The permission catalogue: which names it holds, and in which category.

#include <gmock/gmock.h>

#include "Facebook/Palisade/VXFacebookPermissionCategories.h"
#include "Tests/Unit/Consent/KnownPermissions.h"
#include "Tests/Unit/Support/Scene.h"

namespace palisade {
namespace {

using ::testing::Contains;
using ::testing::IsNull;
using ::testing::IsSubsetOf;
using ::testing::Not;
using ::testing::NotNull;
using ::testing::SizeIs;
using ::testing::StartsWith;
using ::testing::UnorderedElementsAreArray;

class TheCatalogue : public ::testing::Test {
 protected:
  const std::shared_ptr<PluginUnderTest> plugin = Scene().plugin;

  std::vector<const PermissionSet*> lists() const {
    return {&plugin->_basicReadPermissions(), &plugin->_extendedReadPermissions(), &plugin->_writePermissions(),
            &plugin->_managePermissions()};
  }

  // How many of the four lists hold the name.
  std::ptrdiff_t listsWith(const std::string& name) const {
    return std::ranges::count_if(lists(), [&](const PermissionSet* list) { return list->contains(name); });
  }
};

TEST_F(TheCatalogue, HoldsTheBasicReadPermissionsNameByName) {
  EXPECT_THAT(plugin->_basicReadPermissions(), UnorderedElementsAreArray(known::basicRead));
}

TEST_F(TheCatalogue, HoldsTheExtendedReadPermissionsNameByName) {
  EXPECT_THAT(plugin->_extendedReadPermissions(), UnorderedElementsAreArray(known::extendedRead()));
}

TEST_F(TheCatalogue, HoldsTheWritePermissionsNameByName) {
  EXPECT_THAT(plugin->_writePermissions(), UnorderedElementsAreArray(known::write));
}

TEST_F(TheCatalogue, HoldsTheManagePermissionsNameByName) {
  EXPECT_THAT(plugin->_managePermissions(), UnorderedElementsAreArray(known::manage));
}

TEST_F(TheCatalogue, HoldsSixAndFortyNineAndFourAndSevenNames) {
  EXPECT_THAT(plugin->_basicReadPermissions(), SizeIs(6));
  EXPECT_THAT(plugin->_extendedReadPermissions(), SizeIs(49));
  EXPECT_THAT(plugin->_writePermissions(), SizeIs(4));
  EXPECT_THAT(plugin->_managePermissions(), SizeIs(7));
}

TEST_F(TheCatalogue, FilesNoNameInTwoCategories) {
  for (const PermissionSet* list : lists()) {
    for (const std::string& name : *list) EXPECT_EQ(listsWith(name), 1) << name;
  }
}

TEST_F(TheCatalogue, PairsTheUsersOwnObjectsWithTheFriendsExceptForBirthdayAndLocation) {
  for (const std::string& name : plugin->_extendedReadPermissions()) {
    if (!name.starts_with("friends_") || name == "friends_birthday" || name == "friends_location") continue;
    EXPECT_THAT(plugin->_extendedReadPermissions(), Contains("user_" + name.substr(8)));
  }
}

TEST_F(TheCatalogue, FilesBirthdayAndLocationAsBasicForTheUserAndAsExtendedForTheFriends) {
  for (const char* name : {"user_birthday", "user_location"}) {
    EXPECT_THAT(plugin->_basicReadPermissions(), Contains(name));
    EXPECT_THAT(plugin->_extendedReadPermissions(), Not(Contains(name)));
  }
  for (const char* name : {"friends_birthday", "friends_location"}) {
    EXPECT_THAT(plugin->_extendedReadPermissions(), Contains(name));
    EXPECT_THAT(plugin->_basicReadPermissions(), Not(Contains(name)));
  }
}

TEST_F(TheCatalogue, FilesTheFriendListAsBasicAndWhatBelongsToFriendsAsExtended) {
  EXPECT_THAT(plugin->_basicReadPermissions(), Contains("friends"));
  EXPECT_THAT(plugin->_extendedReadPermissions(), Not(Contains("friends")));
  EXPECT_THAT(plugin->_basicReadPermissions(), Not(Contains(StartsWith("friends_"))));
}

TEST_F(TheCatalogue, FilesPublishingAsWriteWithAndWithoutASuffix) {
  EXPECT_THAT(plugin->_writePermissions(), Contains("publish"));
  EXPECT_THAT(plugin->_writePermissions(), Contains("publish_checkins"));
  EXPECT_THAT(plugin->_extendedReadPermissions(), Not(Contains("publish_checkins")));
  EXPECT_THAT(plugin->_extendedReadPermissions(), Contains("user_checkins"));
  EXPECT_THAT(plugin->_extendedReadPermissions(), Contains("friends_checkins"));
}

TEST_F(TheCatalogue, FilesFriendListsAsManageToChangeAndAsExtendedReadToSee) {
  EXPECT_THAT(plugin->_managePermissions(), Contains("manage_friendlists"));
  EXPECT_THAT(plugin->_extendedReadPermissions(), Not(Contains("manage_friendlists")));
  EXPECT_THAT(plugin->_extendedReadPermissions(), Contains("read_friendlists"));
}

TEST_F(TheCatalogue, KnowsNoNameInAnotherSpelling) {
  for (const std::string& name : known::together({known::read(), known::write, known::manage})) {
    const std::string upper = known::upperCased(name);
    for (const std::string& other :
         {name + " ", " " + name, upper, name + '\0', name + "s_", name.substr(0, name.size() - 1)}) {
      EXPECT_EQ(listsWith(other), 0) << other;
    }
  }
  EXPECT_EQ(listsWith(""), 0);
  EXPECT_EQ(listsWith("basic_profile"), 0);
}

TEST_F(TheCatalogue, AnswersTheCachedSetOfEachCategory) {
  EXPECT_EQ(plugin->_allPermissionsInCategory("basic-read"), &plugin->_basicReadPermissions());
  EXPECT_EQ(plugin->_allPermissionsInCategory("extended-read"), &plugin->_extendedReadPermissions());
  EXPECT_EQ(plugin->_allPermissionsInCategory("write"), &plugin->_writePermissions());
  EXPECT_EQ(plugin->_allPermissionsInCategory("manage"), &plugin->_managePermissions());
}

TEST_F(TheCatalogue, AnswersNoSetForAnythingButItsCategories) {
  for (const char* category : {"unknown", "Write", "WRITE", "", "write ", "read", "basic_read", "publish"}) {
    EXPECT_THAT(plugin->_allPermissionsInCategory(category), IsNull()) << category;
  }
  EXPECT_THAT(plugin->_allPermissionsInCategory(std::nullopt), IsNull());
}

TEST_F(TheCatalogue, ComparesCategoriesByTheirTextAndNotByIdentity) {
  std::string category = "man";
  category += "age";
  EXPECT_THAT(plugin->_allPermissionsInCategory(category), NotNull());
}

TEST_F(TheCatalogue, LogsNothing) {
  Scene scene;
  scene.plugin->_allPermissionsInCategory("unknown");
  scene.plugin->_allReadPermissions();
  EXPECT_THAT(scene.platform.trace.names(), ::testing::IsEmpty());
}

TEST_F(TheCatalogue, NamesItsCategoriesInExportedConstants) {
  EXPECT_STREQ(VXFacebookPermissionCategoryUnknown, "unknown");
  EXPECT_STREQ(VXFacebookPermissionCategoryBasicRead, "basic-read");
  EXPECT_STREQ(VXFacebookPermissionCategoryExtendedRead, "extended-read");
  EXPECT_STREQ(VXFacebookPermissionCategoryWrite, "write");
  EXPECT_STREQ(VXFacebookPermissionCategoryManage, "manage");
}

using AllReadPermissions = TheCatalogue;

TEST_F(AllReadPermissions, AreTheBasicAndTheExtendedOnes) {
  const PermissionSet all = plugin->_allReadPermissions();

  EXPECT_THAT(all, SizeIs(55));
  EXPECT_THAT(all, UnorderedElementsAreArray(known::read()));
  for (const std::string& name : known::together({known::write, known::manage})) EXPECT_THAT(all, Not(Contains(name)));
}

TEST_F(AllReadPermissions, AreTheCallersToChange) {
  PermissionSet changed = plugin->_allReadPermissions();
  const PermissionSet other = plugin->_allReadPermissions();
  changed.clear();
  changed.insert("mine");

  EXPECT_THAT(other, UnorderedElementsAreArray(known::read()));
  EXPECT_THAT(plugin->_allReadPermissions(), UnorderedElementsAreArray(known::read()));
  EXPECT_THAT(plugin->_basicReadPermissions(), UnorderedElementsAreArray(known::basicRead));
  EXPECT_THAT(plugin->_extendedReadPermissions(), UnorderedElementsAreArray(known::extendedRead()));
}

using UserProfileReadPermissions = TheCatalogue;

TEST_F(UserProfileReadPermissions, AreEightExtendedReadPermissionsOfTheUsersOwn) {
  const PermissionSet profile = plugin->_userProfileReadPermissions();

  EXPECT_THAT(profile, SizeIs(8));
  EXPECT_THAT(profile, UnorderedElementsAreArray(known::userProfile));
  EXPECT_THAT(profile, IsSubsetOf(plugin->_extendedReadPermissions()));
  EXPECT_THAT(profile, ::testing::Each(StartsWith("user_")));
}

}  // namespace
}  // namespace palisade
