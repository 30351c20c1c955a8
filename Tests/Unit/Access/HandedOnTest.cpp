// What a request is for reaches everyone who decides about it: the sentence that the user reads, the server that describes, the
// server that issues the token, and the record. A value that gets lost on the way says another thing to each of them.

#include <ostream>
#include <string>

#include <gmock/gmock.h>

#include "Tests/Unit/Consent/ConsentScene.h"

namespace palisade {
namespace {

using ::testing::ElementsAre;
using ::testing::Field;
using ::testing::IsEmpty;

const Value accountMe = Dictionary{{"$account", "me"}};
const Value photosInTrace = Dictionary{{"$client", "photos"}};

struct AudienceWords {
  const char* name;
  std::string_view audience;
  const char* phraseKey;
  const char* serversWord;
};

void PrintTo(const AudienceWords& words, std::ostream* stream) { *stream << words.name; }

const AudienceWords audiences[] = {{"Everyone", FacebookAudienceEveryone, "POST_PUBLICALLY", "EVERYONE"},
                                   {"Friends", FacebookAudienceFriends, "POST_TO_FRIENDS", "ALL_FRIENDS"},
                                   {"OnlyMe", FacebookAudienceOnlyMe, "POST_PRIVATELY", "SELF"}};

class ARequestToPublish : public ::testing::TestWithParam<AudienceWords>, protected ConsentScene {
 protected:
  ARequestToPublish() {
    addAccount();
    platform.alert.answers = {userAllows()};
    serverDescribes(R"("see the future")");
    serverAnswers(serverGrants({"publish"}));
  }

  Dictionary options() const { return optionsAskingFor({"publish", "future"}, GetParam().audience); }

  Event only(std::string_view event) const {
    const auto found = platform.trace.named(event);
    EXPECT_EQ(found.size(), 1U) << event;
    return found.empty() ? Event{} : found.front();
  }
};

TEST_P(ARequestToPublish, SaysInItsSentenceWhoWillSeeWhatIsPosted) {
  EXPECT_THAT(requestAccess(options()), isGrant());

  const std::string posting = shown("ACCCOUNT_ACCESS_WRITE", {text(GetParam().phraseKey)});
  EXPECT_EQ(*only("SystemAlert.createAlert")["description"].dictionary()->find("message"),
            Value(shown("ACCOUNT_ACCESS_ONE_PERMISSION_FORMAT", {"Photos", posting}) + " " +
                  shown("ACCOUNT_ACCESS_UNKNOWN_ADDITIONAL_FORMAT", {"see the future"})));
}

TEST_P(ARequestToPublish, TellsTheServerThatDescribesForWhomAndForWhichAccount) {
  EXPECT_THAT(requestAccess(options()), isGrant());

  EXPECT_EQ(only("FacebookPermissionDescriptionRequest.init").members,
            (Dictionary{{"permissions", tracedSet({"future"})}, {"audience", GetParam().serversWord}}));
  EXPECT_EQ(only("FacebookPermissionDescriptionRequest.setAccessToken")["token"], Value("master token of me"));
}

TEST_P(ARequestToPublish, TellsTheServerThatIssuesTheTokenForWhomAndForWhichAccount) {
  EXPECT_THAT(requestAccess(options()), isGrant());

  EXPECT_EQ(only("FacebookAuthorizationRequest.init").members, (Dictionary{{"appID", photosAppID},
                                                                           {"bundleID", "org.example.photos"},
                                                                           {"permissions", tracedSet({"future", "publish"})},
                                                                           {"audience", GetParam().serversWord}}));
  EXPECT_EQ(only("FacebookAuthorizationRequest.setAccessToken")["token"], Value("master token of me"));
  for (const Event& read : platform.trace.named("KeychainManager.credentialForAccount")) {
    EXPECT_EQ(read.members, (Dictionary{{"account", accountMe}, {"clientID", nullptr}}));
  }
}

TEST_P(ARequestToPublish, KeepsTokenAndRecordForThatAccountThatClientAndThatAudience) {
  EXPECT_THAT(requestAccess(options()), isGrant());

  EXPECT_EQ(only("KeychainManager.setCredentialForAccount").members,
            (Dictionary{
                {"account", accountMe},
                {"clientID", "org.example.photos"},
                {"credential", Dictionary{{"token", "client token"}, {"refreshToken", ""}, {"expiryDate", "distantFuture"}}}}));
  EXPECT_EQ(only("AuthorizationManager.setAuthorization").members,
            (Dictionary{{"client", photosInTrace},
                        {"accountType", AccountTypeIdentifierFacebook},
                        {"record", Dictionary{{"client", photosInTrace},
                                              {"granted", true},
                                              {"options", persistentOptions(GetParam().audience)},
                                              {"permissions", tracedSet({"publish"})}}}}));
}

TEST_P(ARequestToPublish, IsRefusedForThatAudience) {
  platform.alert.answers = {userRefuses()};
  EXPECT_THAT(requestAccess(options()), isRefusalWith(accountsError(7)));
  EXPECT_EQ(record(), (RecordData{.granted = false, .options = persistentOptions(GetParam().audience)}));
}

INSTANTIATE_TEST_SUITE_P(, ARequestToPublish, ::testing::ValuesIn(audiences), nameOfCase<AudienceWords>);

class ADefaultAccessToPublish : public ::testing::TestWithParam<AudienceWords>, protected ConsentScene {
 protected:
  ADefaultAccessToPublish() : ConsentScene(photosClientEntitledTo(FacebookDefaultAccessEntitlement)) {}
};

TEST_P(ADefaultAccessToPublish, TellsTheServerForWhomAndForWhichAccount) {
  addAccount();
  serverAnswers(serverGrants({"publish"}));

  EXPECT_THAT(requestAccess(optionsAskingFor({"publish"}, GetParam().audience)), isGrant());

  EXPECT_THAT(platform.trace.named("FacebookAuthorizationRequest.init"),
              ElementsAre(Field(&Event::members, Dictionary{{"appID", photosAppID},
                                                            {"bundleID", "org.example.photos"},
                                                            {"permissions", tracedSet({"publish"})},
                                                            {"audience", GetParam().serversWord}})));
  EXPECT_THAT(members(platform.trace, "FacebookAuthorizationRequest.setAccessToken", "token"),
              ElementsAre(Value("master token of me")));
  EXPECT_EQ(record(), (RecordData{.options = persistentOptions(GetParam().audience), .permissions = PermissionSet{"publish"}}));
}

TEST_P(ADefaultAccessToPublish, IsKeptForThatAudienceAlsoWithoutAnAccount) {
  EXPECT_THAT(requestAccess(optionsAskingFor({"publish"}, GetParam().audience)), isGrant());
  EXPECT_EQ(record(), (RecordData{.options = persistentOptions(GetParam().audience), .permissions = PermissionSet{"publish"}}));
}

INSTANTIATE_TEST_SUITE_P(, ADefaultAccessToPublish, ::testing::ValuesIn(audiences), nameOfCase<AudienceWords>);

TEST(AnExtension, AsksUserAndServerForWhatIsNewAndKeepsWhatTheServerGrants) {
  ConsentScene scene;
  scene.addAccount();
  scene.addRecord({.options = persistentOptions(FacebookAudienceOnlyMe), .permissions = PermissionSet{"publish", "email"}});
  scene.platform.alert.answers = {userAllows()};
  scene.serverAnswers(serverGrants({"publish", "email", "user_likes"}));

  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"publish", "user_likes"}, FacebookAudienceOnlyMe)), isGrant());

  EXPECT_THAT(consentAskedFor(scene.platform.trace), ElementsAre("{user_likes}"));
  EXPECT_THAT(members(scene.platform.trace, "FacebookAuthorizationRequest.init", "permissions"),
              ElementsAre(tracedSet({"user_likes"})));
  EXPECT_THAT(members(scene.platform.trace, "FacebookAuthorizationRequest.init", "audience"), ElementsAre(Value("SELF")));
  EXPECT_EQ(scene.record(), (RecordData{.options = persistentOptions(FacebookAudienceOnlyMe),
                                        .permissions = PermissionSet{"publish", "email", "user_likes"}}));
}

}  // namespace
}  // namespace palisade
