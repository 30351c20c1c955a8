// The posting phrase, which names the audience only, and the managing phrase, which lists objects.

#include <gmock/gmock.h>

#include "Tests/Unit/Consent/ConsentScene.h"
#include "Tests/Unit/Consent/KnownPermissions.h"

namespace palisade {
namespace {

using ::testing::IsEmpty;
using ::testing::Optional;

struct AudiencePhrase {
  std::optional<std::string> audience;
  const char* key;
};

const AudiencePhrase audiencePhrases[] = {
    {std::string(FacebookAudienceFriends), "POST_TO_FRIENDS"},
    {std::string(FacebookAudienceOnlyMe), "POST_PRIVATELY"},
    {std::string(FacebookAudienceEveryone), "POST_PUBLICALLY"},
    {std::nullopt, "POST_PUBLICALLY"},
    {"", "POST_PUBLICALLY"},
    {"facebookaudiencefriends", "POST_PUBLICALLY"},
    {"FacebookAudienceFriends ", "POST_PUBLICALLY"},
    {"SELF", "POST_PUBLICALLY"},
    {"%@", "POST_PUBLICALLY"},
};

class TheAudience : public ::testing::Test, protected ConsentScene {};

TEST_F(TheAudience, IsFriendsOrOnlyMeByNameAndEveryoneOtherwise) {
  for (const auto& [audience, key] : audiencePhrases) {
    EXPECT_EQ(plugin->_userFriendlyAudienceString(audience), text(key)) << audience.value_or("none");
  }
}

class TheWritePhrase : public ::testing::Test, protected ConsentScene {
 protected:
  std::optional<std::string> phrase(const PermissionSet& permissions, const std::optional<std::string>& audience) const {
    return plugin->_predicateForPermissions(permissions, "write", audience);
  }
};

TEST_F(TheWritePhrase, NamesTheAudience) {
  for (const auto& [audience, key] : audiencePhrases) {
    EXPECT_THAT(phrase({"publish"}, audience), Optional(shown("ACCCOUNT_ACCESS_WRITE", {text(key)})));
  }
}

TEST_F(TheWritePhrase, DoesNotSayWhichPermissionsWereAskedFor) {
  for (const PermissionSet& permissions : {PermissionSet{}, PermissionSet{"publish"}, PermissionSet{"publish_stream"},
                                           PermissionSet{"publish_actions", "publish_checkins", "email"}}) {
    EXPECT_THAT(phrase(permissions, std::nullopt), Optional(shown("ACCCOUNT_ACCESS_WRITE", {text("POST_PUBLICALLY")})));
  }
}

TEST_F(TheWritePhrase, LooksUpItsFormatAndOneAudience) {
  phrase({"publish"}, std::string(FacebookAudienceOnlyMe));

  std::vector<std::string> keys;
  for (const auto& lookup : platform.strings.lookups()) keys.push_back(lookup.key);
  EXPECT_THAT(keys, ::testing::UnorderedElementsAre("ACCCOUNT_ACCESS_WRITE", "POST_PRIVATELY"));
}

class TheManagePhrase : public ::testing::Test, protected ConsentScene {
 protected:
  std::optional<std::string> phrase(const PermissionSet& permissions) const {
    return plugin->_predicateForPermissions(permissions, "manage", std::nullopt);
  }
};

TEST_F(TheManagePhrase, OfOnePermissionNamesItsObject) {
  for (const std::string& permission : known::manage) {
    EXPECT_THAT(phrase({permission}), Optional(shown("ACCOUNT_ACCESS_MANAGE", {manageName(known::upperCased(permission))})))
        << permission;
  }
}

TEST_F(TheManagePhrase, OfTwoPermissionsNamesOneAndThenTheLast) {
  EXPECT_THAT(phrase({"manage_pages", "create_event"}),
              Optional(shown("ACCOUNT_ACCESS_MANAGE_MULTIPLE", {manageName("CREATE_EVENT"), manageName("MANAGE_PAGES")})));
}

TEST_F(TheManagePhrase, OfMorePermissionsJoinsAllButTheLast) {
  EXPECT_THAT(phrase({"xmpp_login", "manage_pages", "ads_management", "rsvp_event"}),
              Optional(shown("ACCOUNT_ACCESS_MANAGE_MULTIPLE",
                             {separated({manageName("ADS_MANAGEMENT"), manageName("MANAGE_PAGES"), manageName("RSVP_EVENT")}),
                              manageName("XMPP_LOGIN")})));
}

TEST_F(TheManagePhrase, CountsTwoPermissionsOfTheSameTextOnce) {
  platform.strings.set("FACEBOOK_MANAGE_PERMISSION_CREATE_EVENT", "events");
  platform.strings.set("FACEBOOK_MANAGE_PERMISSION_RSVP_EVENT", "events");

  EXPECT_THAT(phrase({"create_event", "rsvp_event"}), Optional(shown("ACCOUNT_ACCESS_MANAGE", {"events"})));
  EXPECT_THAT(phrase({"create_event", "rsvp_event", "manage_pages"}),
              Optional(shown("ACCOUNT_ACCESS_MANAGE_MULTIPLE", {manageName("MANAGE_PAGES"), "events"})));
}

TEST_F(TheManagePhrase, OfNothingAtAllHasNothingToFillIn) {
  EXPECT_THAT(phrase({}), Optional(shown("ACCOUNT_ACCESS_MANAGE_MULTIPLE", {"", ""})));
}

TEST_F(TheManagePhrase, CopiesNamesThatLookLikeFormats) {
  platform.strings.set("FACEBOOK_MANAGE_PERMISSION_CREATE_EVENT", "%@ %d");
  platform.strings.set("FACEBOOK_MANAGE_PERMISSION_MANAGE_PAGES", "%@%%");

  EXPECT_THAT(phrase({"create_event"}), Optional(shown("ACCOUNT_ACCESS_MANAGE", {"%@ %d"})));
  EXPECT_THAT(phrase({"create_event", "manage_pages"}), Optional(shown("ACCOUNT_ACCESS_MANAGE_MULTIPLE", {"%@ %d", "%@%%"})));
}

TEST_F(TheManagePhrase, GivesTheLastPlaceholderToTheSameNameEachTime) {
  const std::vector<std::string>& names = known::manage;
  const auto expected = phrase({names.begin(), names.end()});
  EXPECT_EQ(phrase({names.rbegin(), names.rend()}), expected);
}

class ACategory : public ::testing::Test, protected ConsentScene {};

TEST_F(ACategory, ThatHasNoPhrasesYieldsNoneAndNoLogRecord) {
  for (const char* category : {"unknown", "", "Write", "READ", "manage ", "extended_read"}) {
    EXPECT_EQ(plugin->_predicateForPermissions({"email", "publish", "manage_pages"}, category, std::nullopt), std::nullopt);
  }
  EXPECT_THAT(platform.trace.events(), IsEmpty());
  EXPECT_THAT(platform.strings.lookups(), IsEmpty());
}

}  // namespace
}  // namespace palisade
