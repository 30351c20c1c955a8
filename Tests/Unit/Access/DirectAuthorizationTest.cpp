// Granting access on the daemon's word, without asking the user.

#include <ostream>
#include <string>
#include <vector>

#include <gmock/gmock.h>

#include "Tests/Unit/Access/EagerSocialFramework.h"
#include "Tests/Unit/Access/OptionKeys.h"
#include "Tests/Unit/Support/Scene.h"

namespace palisade {
namespace {

using ::testing::ElementsAre;
using ::testing::Field;
using ::testing::FieldsAre;
using ::testing::IsEmpty;

constexpr const char* operation = "authorizeAccessToAccountsOfType:forClient:store:completion:";
constexpr const char* strange = "This is strange behavior. We're being asked to directly authorize %@ for Facebook access.";

const RecordData refusedForFriends{.granted = false, .options = persistentOptions(FacebookAudienceFriends)};

RecordData grantedWith(std::optional<PermissionSet> permissions) {
  return {.options = persistentOptions(FacebookAudienceFriends), .permissions = std::move(permissions)};
}

const Dictionary audit{{"accountType", AccountTypeIdentifierFacebook},
                       {"bundleID", "org.example.photos"},
                       {"granted", true},
                       {"userPrompted", false},
                       {"elapsed", 0.0}};

TEST(ADirectAuthorization, RecordsThePermissionsThatTheServerGrants) {
  Scene scene;
  scene.addAccount();
  scene.addRecord(refusedForFriends);
  scene.platform.social.authorizationAnswers = {serverGrants({"user_likes", "email", "email", 7})};

  EXPECT_THAT(scene.authorize(), isGrant());

  const Trace& trace = scene.platform.trace;
  EXPECT_THAT(stepsOf(trace),
              ElementsAre("AccountStore.accountsWithAccountTypeIdentifier", "Account.setAccountType",
                          "AuthorizationManager.authorizationForClient", "FacebookAuthorizationRequest.init",
                          "KeychainManager.credentialForAccount", "FacebookAuthorizationRequest.setAccessToken",
                          "FacebookAuthorizationRequest.performRequestWithHandler", "\"Access request response: %@\"",
                          "Account.setCredential", "KeychainManager.setCredentialForAccount",
                          "AuthorizationManager.setAuthorization", "logAccessRequest", "completion"));
  EXPECT_THAT(trace.named("FacebookAuthorizationRequest.init"),
              ElementsAre(Field(&Event::members, Dictionary{{"appID", photosAppID},
                                                            {"bundleID", "org.example.photos"},
                                                            {"permissions", Value()},
                                                            {"audience", Value()}})));
  EXPECT_THAT(trace.named("logAccessRequest"), ElementsAre(Field(&Event::members, audit)));
  EXPECT_EQ(scene.record(), grantedWith(PermissionSet{"user_likes", "email"}));
}

TEST(ADirectAuthorization, StoresAndAnswersOnTheCallingThread) {
  Scene scene;
  scene.addAccount();
  scene.addRecord(refusedForFriends);
  scene.platform.social.authorizationAnswers = {serverGrants({"email"})};
  scene.authorize();
  for (const char* event : {"AuthorizationManager.setAuthorization", "logAccessRequest", "completion"}) {
    EXPECT_EQ(scene.platform.trace.named(event).at(0).thread, "daemon") << event;
  }
  EXPECT_EQ(scene.platform.trace.named("KeychainManager.setCredentialForAccount").at(0).thread, "request");
}

TEST(ADirectAuthorization, WritesNoLogOfItsOwnForAClientWithARecord) {
  Scene scene;
  scene.addAccount();
  scene.addRecord({.options = Dictionary()});
  scene.authorize();
  EXPECT_THAT(logLines(scene.platform.trace), IsEmpty());
}

TEST(ADirectAuthorization, IsRefusedWithoutAnAccount) {
  Scene scene;
  scene.addRecord(refusedForFriends);
  EXPECT_THAT(scene.authorize(), isRefusalWithoutError());
  EXPECT_THAT(stepsOf(scene.platform.trace), ElementsAre("AccountStore.accountsWithAccountTypeIdentifier", "completion"));
  EXPECT_EQ(scene.record(), refusedForFriends);
}

TEST(ADirectAuthorization, GrantsWithoutPermissionsWhenTheServerFails) {
  const ServerAnswer failures[] = {
      serverCannotBeReached(),
      {},
      {.data = "not JSON"},
      {.data = R"({"error_msg": "no"})"},
      {.data = R"({"access_token": 7, "permissions": ["email"]})"},
      {.data = R"({"access_token": "T", "permissions": "email"})"},
      {.data = R"({"access_token": "T"})"},
  };
  for (const ServerAnswer& failure : failures) {
    Scene scene;
    scene.addAccount();
    scene.addRecord(grantedWith(PermissionSet{"email"}));
    scene.platform.social.authorizationAnswers = {failure};
    EXPECT_THAT(scene.authorize(), isGrant()) << failure.data.value_or("no data");
    EXPECT_EQ(scene.record(), grantedWith(PermissionSet{})) << failure.data.value_or("no data");
  }
}

TEST(ADirectAuthorization, GrantsWithoutPermissionsToAClientWithoutABundleID) {
  Scene scene({.id = "photos"});
  scene.addAccount();
  scene.addRecord(refusedForFriends);
  EXPECT_THAT(scene.authorize(), isGrant());
  EXPECT_THAT(scene.platform.trace.named("FacebookAuthorizationRequest.init"), IsEmpty());
  EXPECT_EQ(scene.record(), grantedWith(PermissionSet{}));
}

TEST(ADirectAuthorization, MakesARecordForAClientWithoutOne) {
  Scene scene;
  scene.addAccount();

  EXPECT_THAT(scene.authorize(), isGrant());

  EXPECT_THAT(stepsOf(scene.platform.trace),
              ElementsAre("AccountStore.accountsWithAccountTypeIdentifier", "Account.setAccountType",
                          "AuthorizationManager.authorizationForClient", std::string("\"") + strange + '"',
                          "AuthorizationManager.setAuthorization", "logAccessRequest", "completion"));
  EXPECT_THAT(logLines(scene.platform.trace),
              ElementsAre(LogLine{7, operation, strange, {"org.example.photos (Photos)"}, "client"}));
  EXPECT_EQ(scene.record(), (RecordData{.granted = true}));
  EXPECT_THAT(scene.platform.trace.named("logAccessRequest"), ElementsAre(Field(&Event::members, audit)));
}

struct StoredOptions {
  const char* name;
  std::optional<Dictionary> options;
};

void PrintTo(const StoredOptions& stored, std::ostream* stream) { *stream << stored.name; }

class AGrantWithoutAUsableAppID : public ::testing::TestWithParam<StoredOptions> {};

TEST_P(AGrantWithoutAUsableAppID, LosesItsPermissionsWhenItIsAuthorizedDirectly) {
  Scene scene;
  scene.addAccount();
  scene.addRecord({.options = GetParam().options, .permissions = PermissionSet{"email"}});

  EXPECT_THAT(scene.authorize(), isGrant());

  EXPECT_THAT(stepsOf(scene.platform.trace),
              ElementsAre("AccountStore.accountsWithAccountTypeIdentifier", "Account.setAccountType",
                          "AuthorizationManager.authorizationForClient", "AuthorizationManager.setAuthorization",
                          "logAccessRequest", "completion"));
  EXPECT_EQ(scene.record(), (RecordData{.granted = true, .options = GetParam().options}));
}

INSTANTIATE_TEST_SUITE_P(, AGrantWithoutAUsableAppID,
                         ::testing::Values(StoredOptions{"NoOptions", std::nullopt},
                                           StoredOptions{"NoAppID", Dictionary{{"further key", "1"}}},
                                           StoredOptions{"ANumber", Dictionary{{appIDKey, 1234}}},
                                           StoredOptions{"Null", Dictionary{{appIDKey, nullptr}}},
                                           StoredOptions{"ADictionary", Dictionary{{appIDKey, Dictionary()}}}),
                         nameOfCase<StoredOptions>);

TEST(AGrantWithAnEmptyAppID, IsAuthorizedByTheServer) {
  Scene scene;
  scene.addAccount();
  scene.addRecord({.options = Dictionary{{appIDKey, ""}}});
  scene.platform.social.authorizationAnswers = {serverGrants({"email"})};
  EXPECT_THAT(scene.authorize(), isGrant());
  EXPECT_EQ(scene.platform.trace.named("FacebookAuthorizationRequest.init").at(0)["appID"], Value(""));
  EXPECT_EQ(scene.record()->permissions, PermissionSet{"email"});
}

TEST(ADirectAuthorization, ReportsTheStoresErrorAfterTheAccessRequestRecord) {
  Scene scene;
  scene.addAccount();
  scene.addRecord({.granted = false, .options = Dictionary()});
  const Error full{.domain = "store", .code = 28, .description = "The disk is full.", .furtherInfo = {{"device", "/dev/sda1"}}};
  scene.authorizations.answerWrites({full});

  EXPECT_THAT(scene.authorize(), isRefusalWith(full));

  EXPECT_THAT(stepsOf(scene.platform.trace),
              ElementsAre("AccountStore.accountsWithAccountTypeIdentifier", "Account.setAccountType",
                          "AuthorizationManager.authorizationForClient", "AuthorizationManager.setAuthorization",
                          "logAccessRequest", "completion"));
  EXPECT_THAT(scene.platform.trace.named("logAccessRequest"), ElementsAre(Field(&Event::members, audit)));
  EXPECT_EQ(scene.record(), (RecordData{.granted = false, .options = Dictionary()}));
}

TEST(ADirectAuthorization, TakesAnAnswerThatComesInsideTheCall) {
  Scene scene;
  scene.addAccount();
  scene.addRecord(refusedForFriends);
  scene.platform.social.authorizationAnswers = {serverGrants({"email"}, Delivery::inLine)};
  EXPECT_THAT(scene.authorize(), isGrant());
  EXPECT_EQ(scene.record(), grantedWith(PermissionSet{"email"}));
}

TEST(ADirectAuthorization, TakesAnAnswerThatCameOnAnotherThreadBeforeTheWait) {
  Scene scene;
  EagerSocialFramework eager(scene.platform);
  PlatformServices services = scene.platform.services();
  services.social = &eager;
  const auto plugin = std::make_shared<PluginUnderTest>(services);
  scene.addAccount();
  scene.addRecord(refusedForFriends);
  scene.platform.social.authorizationAnswers = {serverGrants({"email"})};

  EXPECT_THAT(scene.performHere([&](const AccessCompletion& completion) {
    plugin->authorizeAccessToAccountsOfType(scene.facebook, scene.client, scene.store, completion);
  }),
              isGrant());

  EXPECT_EQ(scene.record(), grantedWith(PermissionSet{"email"}));
  EXPECT_EQ(scene.platform.trace.named("KeychainManager.setCredentialForAccount").at(0).thread, "request");
}

TEST(ADirectAuthorization, WaitsForEverForAServerThatNeverAnswers) {
  Scene& scene = *new Scene;  // The operation never returns; what it uses stays.
  scene.addAccount();
  scene.addRecord(refusedForFriends);
  scene.platform.social.authorizationAnswers = {{.delivery = Delivery::never}};
  const OperationEnd end = scene.platform.run([&scene] {
    scene.plugin->authorizeAccessToAccountsOfType(scene.facebook, scene.client, scene.store, scene.platform.completion());
  });
  EXPECT_EQ(end, OperationEnd::waitsForSemaphore);
  EXPECT_THAT(scene.platform.completions(), IsEmpty());
  EXPECT_EQ(scene.record(), refusedForFriends);
}

TEST(ADirectAuthorization, GrantsWithoutPermissionsWhateverErrorTheFrameworkDelivers) {
  // The last two read like the plug-in's own word for a failure. It was not the plug-in that failed.
  const Error errors[] = {
      networkDown,
      accountsError(AccountsErrorAccessDenied),
      accountsError(AccountsErrorUnexpectedFailure),
      accountsError(AccountsErrorUnexpectedFailure, "The access decision failed unexpectedly: out of file descriptors"),
  };
  for (const Error& error : errors) {
    Scene scene;
    scene.addAccount();
    scene.addRecord(refusedForFriends);
    scene.platform.social.authorizationAnswers = {{.error = error}};
    EXPECT_THAT(scene.authorize(), isGrant()) << describe(error);
    EXPECT_EQ(scene.record(), grantedWith(PermissionSet{})) << describe(error);
  }
}

TEST(ADirectAuthorization, IsRefusedWhenTheTokenCannotBeDealtWith) {
  Scene scene;
  scene.addAccount();
  scene.addRecord(refusedForFriends);
  scene.platform.social.authorizationAnswers = {serverGrants({"email"})};
  scene.platform.faults.throwOn("KeychainManager.setCredentialForAccount");
  const CompletionCall answer = scene.authorize();
  EXPECT_THAT(answer, isUnexpectedFailureAnswer());
  EXPECT_THAT(answer.error->description, ::testing::Optional(::testing::HasSubstr("KeychainManager.setCredentialForAccount")));
  EXPECT_EQ(scene.record(), refusedForFriends);
}

TEST(ADirectAuthorization, IsAGrantOnceItsRecordIsStoredEvenIfNobodyCanWriteThatDown) {
  for (const char* call : {"Log.logAccessRequest", "Client.bundleID"}) {
    Scene scene;
    scene.addAccount();
    scene.platform.faults.throwAlwaysOn(call);
    EXPECT_THAT(scene.authorize(), isGrant()) << call;
    EXPECT_EQ(scene.record(), (RecordData{.granted = true})) << call;
    EXPECT_THAT(logLines(scene.platform.trace).back(),
                ::testing::AllOf(Field(&LogLine::operation, operation), Field(&LogLine::level, 3)));
  }
}

}  // namespace
}  // namespace palisade
