// The consent message: which sentence is chosen, what is put into it, and what is written down on the way.

#include <gmock/gmock.h>

#include "Testing/TraceValue.h"
#include "Tests/Unit/Consent/ConsentScene.h"

namespace palisade {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::Optional;

const std::string readingLikes =
    shown("ACCOUNT_ACCESS_EXTENDED_READ", {shown("ACCOUNT_ACCESS_EXTENDED_READ_USER", {readName("USER_LIKES")})});
const std::string readingPhotos =
    shown("ACCOUNT_ACCESS_EXTENDED_READ", {shown("ACCOUNT_ACCESS_EXTENDED_READ_USER", {readName("USER_PHOTOS")})});
const std::string readingBasics =
    shown("ACCOUNT_ACCESS_EXTENDED_READ",
          {shown("ACCOUNT_ACCESS_EXTENDED_READ_USER_MULTIPLE", {readName("BASIC_PROFILE"), readName("FRIENDS")})});
const std::string posting = shown("ACCCOUNT_ACCESS_WRITE", {text("POST_PUBLICALLY")});
const std::string postingToFriends = shown("ACCCOUNT_ACCESS_WRITE", {text("POST_TO_FRIENDS")});
const std::string managingPages = shown("ACCOUNT_ACCESS_MANAGE", {manageName("MANAGE_PAGES")});

constexpr const char* composer = "_constructUserMessageForPermissions:audience:appName:account:";

class TheConsentMessage : public ::testing::Test, protected ConsentScene {
 protected:
  // The five sentence formats that were looked up, in order.
  std::vector<std::string> sentencesLookedUp() const {
    std::vector<std::string> keys;
    for (const auto& lookup : platform.strings.lookups()) {
      const bool isSentence = lookup.key == "ACCOUNT_ACCESS_BASIC_MESSAGE" ||
                              lookup.key.find("_PERMISSION_FORMAT") != std::string::npos ||
                              lookup.key.find("_PERMISSION_SHORT_FORMAT") != std::string::npos;
      if (isSentence) keys.push_back(lookup.key);
    }
    return keys;
  }
};

TEST_F(TheConsentMessage, OfNoPermissionsIsTheBasicOneAndAsksNoServer) {
  EXPECT_THAT(message({}), Optional(shown("ACCOUNT_ACCESS_BASIC_MESSAGE", {"Photos"})));

  EXPECT_THAT(platform.trace.names(), ElementsAre("log"));
  EXPECT_THAT(sentencesLookedUp(), ElementsAre("ACCOUNT_ACCESS_BASIC_MESSAGE"));
}

TEST_F(TheConsentMessage, OfEmailAloneIsTheShortOne) {
  EXPECT_THAT(message({"email"}), Optional(shown("ACCOUNT_ACCESS_ONE_PERMISSION_SHORT_FORMAT", {"Photos", readingBasics})));

  EXPECT_THAT(sentencesLookedUp(), ElementsAre("ACCOUNT_ACCESS_ONE_PERMISSION_SHORT_FORMAT"));
}

TEST_F(TheConsentMessage, OfReadingAndAnUnlistedNameIsTheLongOneFollowedByTheServersWords) {
  serverDescribes(R"("new things")");

  EXPECT_THAT(message({"user_likes", "new_thing"}),
              Optional(shown("ACCOUNT_ACCESS_ONE_PERMISSION_FORMAT", {"Photos", readingLikes}) + " " +
                       shown("ACCOUNT_ACCESS_UNKNOWN_ADDITIONAL_FORMAT", {"new things"})));

  EXPECT_THAT(members(platform.trace, "FacebookPermissionDescriptionRequest.init", "permissions"),
              ElementsAre(traceSet(permissionSet({"new_thing"}))));
  EXPECT_THAT(logLines(platform.trace),
              ElementsAre(LogLine{.level = 7,
                                  .operation = composer,
                                  .format = "Generating user message for permission: %@.",
                                  .arguments = {"{new_thing, user_likes}"},
                                  .argumentNames = "permissions"},
                          LogLine{.level = 7, .operation = composer, .format = "Unknown permissions were requested!"},
                          LogLine{.level = 7,
                                  .operation = "_fetchDescriptionForUnknownPermissions:audience:account:",
                                  .format = "Server description for %@ was: %@",
                                  .arguments = {"{new_thing}", "new things"},
                                  .argumentNames = "permissions, description"}));
}

TEST_F(TheConsentMessage, OfPublishStreamAloneIsTheLongOne) {
  EXPECT_THAT(message({"publish_stream"}), Optional(shown("ACCOUNT_ACCESS_ONE_PERMISSION_FORMAT", {"Photos", posting})));

  EXPECT_THAT(sentencesLookedUp(), ElementsAre("ACCOUNT_ACCESS_ONE_PERMISSION_FORMAT"));
}

TEST_F(TheConsentMessage, OfManagingAloneIsTheLongOne) {
  EXPECT_THAT(message({"manage_pages"}), Optional(shown("ACCOUNT_ACCESS_ONE_PERMISSION_FORMAT", {"Photos", managingPages})));
}

TEST_F(TheConsentMessage, OfAllThreeKindsNamesReadingPostingAndManagingInThatOrder) {
  EXPECT_THAT(message({"manage_pages", "publish_actions", "user_photos"}),
              Optional(shown("ACCOUNT_ACCESS_THREE_PERMISSION_FORMAT", {"Photos", readingPhotos, posting, managingPages})));

  EXPECT_THAT(sentencesLookedUp(), ElementsAre("ACCOUNT_ACCESS_THREE_PERMISSION_FORMAT"));
}

TEST_F(TheConsentMessage, OfPostingAndManagingNamesPostingFirst) {
  EXPECT_THAT(message({"manage_pages", "publish_actions"}),
              Optional(shown("ACCOUNT_ACCESS_TWO_PERMISSION_FORMAT", {"Photos", posting, managingPages})));
}

TEST_F(TheConsentMessage, OfReadingAndPostingNamesReadingFirst) {
  EXPECT_THAT(message({"publish_actions", "email"}),
              Optional(shown("ACCOUNT_ACCESS_TWO_PERMISSION_FORMAT", {"Photos", readingBasics, posting})));
}

TEST_F(TheConsentMessage, OfReadingAndManagingNamesReadingFirst) {
  EXPECT_THAT(message({"manage_pages", "email"}),
              Optional(shown("ACCOUNT_ACCESS_TWO_PERMISSION_FORMAT", {"Photos", readingBasics, managingPages})));
}

TEST_F(TheConsentMessage, NamesTheAudienceOfWhatIsPosted) {
  EXPECT_THAT(message({"publish_actions"}, std::string(FacebookAudienceFriends)),
              Optional(shown("ACCOUNT_ACCESS_ONE_PERMISSION_FORMAT", {"Photos", postingToFriends})));
  EXPECT_THAT(message({"user_likes"}, std::string(FacebookAudienceFriends)),
              Optional(shown("ACCOUNT_ACCESS_ONE_PERMISSION_SHORT_FORMAT", {"Photos", readingLikes})));
}

TEST_F(TheConsentMessage, OfUnlistedNamesAloneStartsFromNothing) {
  serverDescribes(R"("new things")");

  EXPECT_THAT(message({"new_thing"}), Optional(shown("ACCOUNT_ACCESS_UNKNOWN_FORMAT", {"Photos", "new things"})));

  EXPECT_THAT(sentencesLookedUp(), IsEmpty());
}

TEST_F(TheConsentMessage, OfUnlistedNamesAndAllThreeKindsEndsWithTheServersWords) {
  serverDescribes(R"("new things")");

  EXPECT_THAT(message({"new_thing", "other_thing", "manage_pages", "publish", "user_photos"}),
              Optional(shown("ACCOUNT_ACCESS_THREE_PERMISSION_FORMAT", {"Photos", readingPhotos, posting, managingPages}) +
                       " " + shown("ACCOUNT_ACCESS_UNKNOWN_ADDITIONAL_FORMAT", {"new things"})));

  EXPECT_THAT(members(platform.trace, "FacebookPermissionDescriptionRequest.init", "permissions"),
              ElementsAre(traceSet(permissionSet({"new_thing", "other_thing"}))));
}

TEST_F(TheConsentMessage, IsNoneWhenUnlistedNamesCannotBeDescribedAndSaysSoInTheLog) {
  for (const PermissionSet& permissions : {PermissionSet{"new_thing"}, PermissionSet{"new_thing", "email", "publish"}}) {
    serverDescribes(R"("API_EC_PARAM")");
    platform.trace.clear();

    EXPECT_EQ(message(permissions), std::nullopt);

    EXPECT_EQ(logLines(platform.trace).back(),
              (LogLine{.level = 7,
                       .operation = composer,
                       .format = "Something went wrong and we ended up with a nil user message. Falling back to default."}));
  }
}

TEST_F(TheConsentMessage, SaysNothingInTheLogOfAFallBackThatWasNotNeeded) {
  message({"email"});
  message({});

  for (const LogLine& line : logLines(platform.trace)) {
    EXPECT_EQ(line.format, "Generating user message for permission: %@.");
  }
}

TEST_F(TheConsentMessage, TakesEveryNameInAnotherSpellingForAnUnlistedOne) {
  for (const char* name : {"Email", "email ", "user_birthdays", "friends_", "publish_", "basic_profile", "", "unknown"}) {
    serverDescribes(R"("it")");
    EXPECT_THAT(message({name}), Optional(shown("ACCOUNT_ACCESS_UNKNOWN_FORMAT", {"Photos", "it"}))) << name;
  }
}

TEST_F(TheConsentMessage, IsTheSameHoweverOftenItIsComposed) {
  const PermissionSet permissions{"user_photos", "user_likes", "friends_likes", "friends_events", "create_event", "xmpp_login"};
  const auto first = message(permissions);

  EXPECT_EQ(message(permissions), first);
}

TEST_F(TheConsentMessage, CopiesAnAppNameThatLooksLikeAFormat) {
  serverDescribes(R"("new things %@")");

  EXPECT_THAT(message({}, std::nullopt, "%@ 100%"), Optional(shown("ACCOUNT_ACCESS_BASIC_MESSAGE", {"%@ 100%"})));
  EXPECT_THAT(message({"user_likes"}, std::nullopt, "%@%@"),
              Optional(shown("ACCOUNT_ACCESS_ONE_PERMISSION_SHORT_FORMAT", {"%@%@", readingLikes})));
  EXPECT_THAT(message({"new_thing"}, std::nullopt, "%@"),
              Optional(shown("ACCOUNT_ACCESS_UNKNOWN_FORMAT", {"%@", "new things %@"})));
}

TEST_F(TheConsentMessage, CopiesPhrasesThatLookLikeFormats) {
  platform.strings.set("ACCOUNT_ACCESS_EXTENDED_READ", "%@ %@");
  platform.strings.set("ACCOUNT_ACCESS_EXTENDED_READ_USER", "%@");
  platform.strings.set("FACEBOOK_READ_PERMISSION_USER_LIKES", "%@ likes");
  platform.strings.set("POST_PUBLICALLY", "100%@");

  EXPECT_THAT(message({"user_likes", "publish"}),
              Optional(shown("ACCOUNT_ACCESS_TWO_PERMISSION_FORMAT",
                             {"Photos", "%@ likes ", shown("ACCCOUNT_ACCESS_WRITE", {"100%@"})})));
}

TEST_F(TheConsentMessage, BearsNamesAndAppNamesOfAnyBytes) {
  serverDescribes(R"("it")");
  const std::string bytes("\0\n\xff\xfe%@", 6);

  EXPECT_THAT(message({bytes, "user_likes"}, std::nullopt, bytes),
              Optional(shown("ACCOUNT_ACCESS_ONE_PERMISSION_FORMAT", {bytes, readingLikes}) + " " +
                       shown("ACCOUNT_ACCESS_UNKNOWN_ADDITIONAL_FORMAT", {"it"})));
}

TEST_F(TheConsentMessage, OfAThousandUnlistedNamesAsksTheServerOnceForAllOfThem) {
  serverDescribes(R"("many things")");
  PermissionSet permissions{"email"};
  for (int number = 0; number < 1000; ++number) permissions.insert("thing_" + std::to_string(number));

  EXPECT_THAT(message(permissions), Optional(shown("ACCOUNT_ACCESS_ONE_PERMISSION_FORMAT", {"Photos", readingBasics}) + " " +
                                             shown("ACCOUNT_ACCESS_UNKNOWN_ADDITIONAL_FORMAT", {"many things"})));

  permissions.erase("email");
  EXPECT_THAT(members(platform.trace, "FacebookPermissionDescriptionRequest.init", "permissions"),
              ElementsAre(traceSet(std::make_shared<const PermissionSet>(permissions))));
}

}  // namespace
}  // namespace palisade
