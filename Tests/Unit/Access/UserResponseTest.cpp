// How the user's answer ends a request: what is stored, and what the daemon is told.

#include <memory>
#include <string>
#include <vector>

#include <gmock/gmock.h>

#include "Tests/Unit/Support/Scene.h"

namespace palisade {
namespace {

using ::testing::AllOf;
using ::testing::Contains;
using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::Field;
using ::testing::IsEmpty;
using ::testing::Not;
using ::testing::StartsWith;

struct UserAnswer {
  bool approves = true;
  PermissionSet existing = {};
  PermissionSetRef asked = permissionSet({"email"});
  std::string audience = std::string(FacebookAudienceOnlyMe);
  bool isFirstTimeRequest = false;
  bool skipsServer = false;
};

CompletionCall handle(Scene& scene, const UserAnswer& answer, const std::shared_ptr<Account>& account) {
  return scene.perform([&](const AccessCompletion& completion) {
    scene.plugin->_handleUserResponse(answer.approves, scene.client, photosAppID,
                                      std::make_shared<const Dictionary>(persistentOptions(answer.audience)), account,
                                      scene.facebook, answer.existing, answer.asked, answer.audience, answer.isFirstTimeRequest,
                                      answer.skipsServer, scene.store, completion);
  });
}

CompletionCall handle(Scene& scene, const UserAnswer& answer) { return handle(scene, answer, scene.makeAccount()); }

Value tracedRecord(bool granted, Value permissions, std::string_view audience = FacebookAudienceOnlyMe) {
  return Dictionary{{"client", Dictionary{{"$client", "photos"}}},
                    {"granted", granted},
                    {"options", persistentOptions(audience)},
                    {"permissions", std::move(permissions)}};
}

auto stored(Value record) {
  return ElementsAre(Field(&Event::members, Dictionary{{"client", Dictionary{{"$client", "photos"}}},
                                                       {"accountType", AccountTypeIdentifierFacebook},
                                                       {"record", std::move(record)}}));
}

std::vector<Event> writes(const Scene& scene) { return scene.platform.trace.named("AuthorizationManager.setAuthorization"); }

TEST(AnIgnoredRequest, EndsWithoutAnErrorWhateverTheUserAnswered) {
  const UserAnswer answers[] = {{.approves = true},
                                {.approves = false},
                                {.approves = false, .isFirstTimeRequest = true},
                                {.approves = true, .skipsServer = true}};
  for (const UserAnswer& answer : answers) {
    Scene scene;
    const RecordData earlier{.options = persistentOptions({}, "other"), .permissions = PermissionSet{"user_likes"}};
    scene.addRecord(earlier);
    scene.platform.preferences.set(FacebookIgnoreAccessRequests, FacebookPreferencesAppID, 1);

    EXPECT_THAT(handle(scene, answer), isRefusalWithoutError());

    EXPECT_EQ(scene.record(), earlier);
    EXPECT_THAT(stepsOf(scene.platform.trace),
                ElementsAre("Preferences.copyValue",
                            "\"Will not contact server about this access request due to user-set pref.\"", "completion"));
  }
}

TEST(ARefusal, IsStoredWithoutPermissionsForAClientThatHeldNoGrant) {
  Scene scene;
  EXPECT_THAT(handle(scene, {.approves = false, .existing = {"user_likes"}}), isRefusalWith(accountsError(7)));
  EXPECT_THAT(writes(scene), stored(tracedRecord(false, Value())));
  EXPECT_EQ(scene.record(), (RecordData{.granted = false, .options = persistentOptions(FacebookAudienceOnlyMe)}));
  EXPECT_THAT(stepsOf(scene.platform.trace),
              ElementsAre("Preferences.copyValue", "AuthorizationManager.setAuthorization", "completion"));
}

TEST(ARefusal, IsNotStoredForAClientThatHoldsAGrant) {
  Scene scene;
  EXPECT_THAT(handle(scene, {.approves = false, .isFirstTimeRequest = true}), isRefusalWith(accountsError(7)));
  EXPECT_THAT(stepsOf(scene.platform.trace), ElementsAre("Preferences.copyValue", "completion"));
}

TEST(ARefusal, IsReportedAlsoWhenTheStoreDoesNotTakeIt) {
  Scene scene;
  scene.authorizations.answerWrites({Error{.domain = "store", .code = 1}});
  EXPECT_THAT(handle(scene, {.approves = false}), isRefusalWith(accountsError(7)));
  EXPECT_EQ(scene.record(), std::nullopt);
}

TEST(ARefusal, ToAPromptWithoutAMessageCarriesNoPermissions) {
  Scene scene;
  EXPECT_THAT(handle(scene, {.approves = false, .asked = nullptr}), isRefusalWith(accountsError(7)));
  EXPECT_THAT(writes(scene), stored(tracedRecord(false, Value())));
}

TEST(AnApprovalWithoutTheServer, RecordsExistingAndNewPermissionsTogether) {
  Scene scene;

  EXPECT_THAT(
      handle(scene, {.existing = {"email"}, .asked = permissionSet({"user_likes", "email"}), .skipsServer = true}, nullptr),
      isGrant());

  EXPECT_THAT(writes(scene), stored(tracedRecord(true, tracedSet({"email", "user_likes"}))));
  EXPECT_THAT(stepsOf(scene.platform.trace), ElementsAre("Preferences.copyValue", "\"Skipping server request!\"",
                                                         "AuthorizationManager.setAuthorization", "completion"));
  EXPECT_THAT(scene.platform.trace.named("completion"), Each(Field(&Event::thread, "daemon")));
}

TEST(AnApprovalWithoutTheServer, LeavesTheAccountAlone) {
  Scene scene;
  EXPECT_THAT(handle(scene, {.skipsServer = true}, scene.makeAccount()), isGrant());
  EXPECT_THAT(scene.platform.trace.names(), Each(Not(StartsWith("Account."))));
  EXPECT_EQ(scene.platform.keychain.entry("me", "org.example.photos"), nullptr);
}

TEST(AnApprovalWithoutTheServer, RecordsAnEmptySetWhenThereIsNothingToGrant) {
  Scene scene;
  EXPECT_THAT(handle(scene, {.asked = nullptr, .skipsServer = true}), isGrant());
  EXPECT_THAT(writes(scene), stored(tracedRecord(true, tracedSet({}))));
}

TEST(AnApproval, RecordsWhatTheServerGrantedAndNothingElse) {
  Scene scene;
  scene.addRecord({.options = persistentOptions({}, "other"), .permissions = PermissionSet{"user_notes"}});
  scene.platform.social.authorizationAnswers = {serverGrants({"user_likes", "user_photos", "user_likes"})};

  EXPECT_THAT(
      handle(scene,
             {.existing = {"email"}, .asked = permissionSet({"user_likes"}), .audience = std::string(FacebookAudienceFriends)}),
      isGrant());

  EXPECT_THAT(writes(scene), stored(tracedRecord(true, tracedSet({"user_likes", "user_photos"}), FacebookAudienceFriends)));
  EXPECT_THAT(scene.platform.trace.named("FacebookAuthorizationRequest.init"),
              ElementsAre(Field(&Event::members, Dictionary{{"appID", photosAppID},
                                                            {"bundleID", "org.example.photos"},
                                                            {"permissions", tracedSet({"user_likes"})},
                                                            {"audience", "ALL_FRIENDS"}})));
}

TEST(AnApproval, IsStoredBeforeTheDaemonIsToldOnTheThreadOfTheAnswer) {
  Scene scene;
  scene.platform.social.authorizationAnswers = {serverGrants({"email"})};
  EXPECT_THAT(handle(scene, {}), isGrant());
  const std::vector<Event> events = scene.platform.trace.events();
  ASSERT_GE(events.size(), 2U);
  EXPECT_THAT(events[events.size() - 2],
              AllOf(Field(&Event::name, "AuthorizationManager.setAuthorization"), Field(&Event::thread, "request")));
  EXPECT_THAT(events.back(), AllOf(Field(&Event::name, "completion"), Field(&Event::thread, "request")));
}

TEST(AnApproval, RecordsAnEmptySetWhenTheServerNamesNoPermissions) {
  for (const char* body : {R"({"access_token": "T"})", R"({"access_token": "T", "permissions": "email"})",
                           R"({"access_token": "T", "permissions": null})", R"({"access_token": "T", "permissions": []})"}) {
    Scene scene;
    scene.platform.social.authorizationAnswers = {{.data = body}};
    EXPECT_THAT(handle(scene, {}), isGrant()) << body;
    EXPECT_THAT(writes(scene), stored(tracedRecord(true, tracedSet({})))) << body;
  }
}

TEST(AnApproval, PassesOverWhatIsNoStringInTheServersPermissions) {
  Scene scene;
  scene.platform.social.authorizationAnswers = {serverGrants({1, "email", nullptr, Array{"publish"}, true})};
  EXPECT_THAT(handle(scene, {}), isGrant());
  EXPECT_THAT(writes(scene), stored(tracedRecord(true, tracedSet({"email"}))));
}

TEST(AnApproval, IsReportedAlsoWhenTheStoreDoesNotTakeIt) {
  Scene scene;
  scene.platform.social.authorizationAnswers = {serverGrants({"email"})};
  scene.authorizations.answerWrites({Error{.domain = "store", .code = 1}});
  EXPECT_THAT(handle(scene, {}), isGrant());
  EXPECT_EQ(scene.record(), std::nullopt);
}

TEST(AnApprovalThatTheServerFails, ReportsTheServersErrorAndStoresNothing) {
  const struct {
    ServerAnswer answer;
    std::optional<Error> error;
  } failures[] = {
      {serverCannotBeReached(), networkDown},
      {{.data = R"({"access_token": "T"})", .error = networkDown}, networkDown},
      {{}, std::nullopt},
      {{.data = R"({"error_msg": "no"})"}, accountsError(7, "The Facebook server could not fulfill this access request: no")},
      {{.data = "{}"}, accountsError(7, "The Facebook server could not fulfill this access request: (null)")},
  };
  for (const auto& [answer, error] : failures) {
    for (const bool isFirstTimeRequest : {false, true}) {
      Scene scene;
      const RecordData earlier{.options = persistentOptions(), .permissions = PermissionSet{"user_likes"}};
      scene.addRecord(earlier);
      scene.platform.social.authorizationAnswers = {answer};

      EXPECT_THAT(handle(scene, {.isFirstTimeRequest = isFirstTimeRequest}), ::testing::FieldsAre(false, error));

      EXPECT_EQ(scene.record(), earlier);
      EXPECT_THAT(writes(scene), IsEmpty());
    }
  }
}

TEST(AnApprovalOfAClientWithoutABundleID, IsRefusedWithTheReason) {
  Scene scene({.id = "photos", .description = "a tool"});
  EXPECT_THAT(handle(scene, {}), isRefusalWith(accountsError(
                                     16, "Cannot obtain server authorization for client a tool because it has no bundle ID.")));
  EXPECT_THAT(writes(scene), IsEmpty());
}

TEST(APendingServerAnswer, KeepsAllItNeedsAliveUntilItHasCome) {
  FakePlatform& platform = freshPlatform();
  platform.social.authorizationAnswers = {serverGrants({"email"})};
  // A record that is stored would keep its client.
  platform.authorizations.answerWrites({Error{.domain = "store", .code = 1}});
  std::vector<std::weak_ptr<const void>> needed;
  {
    auto plugin = std::make_shared<PluginUnderTest>(platform.services());
    auto client = platform.makeClient(photosClient());
    auto accountType = std::make_shared<const AccountType>(std::string(AccountTypeIdentifierFacebook));
    std::shared_ptr<Account> account =
        std::make_shared<FakeAccount>(Instruments{platform.trace, platform.faults}, FakeAccountData{.id = "me", .type = ""});
    auto store = std::make_shared<FakeAccountStore>(Instruments{platform.trace, platform.faults}, platform.authorizations);
    needed = {plugin, client, accountType, account, store};
    plugin->_handleUserResponse(true, client, photosAppID, std::make_shared<const Dictionary>(), account, accountType, {},
                                permissionSet({"email"}), std::nullopt, false, false, store, platform.completion());
  }
  EXPECT_THAT(platform.completions(), IsEmpty());

  ASSERT_TRUE(platform.deliveries.deliverNext());

  EXPECT_THAT(platform.completions(), ElementsAre(isGrant()));
  for (const auto& object : needed) EXPECT_TRUE(object.expired()) << "Nothing is kept once the answer has been dealt with.";
}

}  // namespace
}  // namespace palisade
