// Which requests are answered at once, with what, and after which calls.

#include <string>
#include <vector>

#include <gmock/gmock.h>

#include "Tests/Unit/Support/Scene.h"

namespace palisade {
namespace {

using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::Not;

constexpr const char* handling = "\"Palisade is handling request for access from %@.\"";
constexpr const char* defaultAccess = "\"Granting default access to %@.\"";

const Dictionary noAppID{{std::string(FacebookPermissionsKey), Array{"email"}}};

TEST(AClientWithAllAccountsAccess, IsGrantedWithValidOptions) {
  Scene scene(photosClientEntitledTo(AllAccountsAccessEntitlement));
  scene.addAccount();
  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email"})), isGrant());
  EXPECT_THAT(stepsOf(scene.platform.trace), ElementsAre(handling, "Client.hasEntitlement", "completion"));
}

TEST(AClientWithAllAccountsAccess, IsGrantedWithAbsentOptionsAndWithoutAnyAccount) {
  Scene scene(photosClientEntitledTo(AllAccountsAccessEntitlement));
  EXPECT_THAT(scene.requestAccess(std::nullopt), isGrant());
  EXPECT_THAT(stepsOf(scene.platform.trace), ElementsAre(handling, "Client.hasEntitlement", "completion"));
}

TEST(AClientWithAllAccountsAccess, IsGrantedWithInvalidOptions) {
  Scene scene(photosClientEntitledTo(AllAccountsAccessEntitlement));
  EXPECT_THAT(scene.requestAccess(noAppID), isGrant());
}

TEST(AClientWithAllAccountsAccess, IsGrantedAlthoughItWasRefusedBefore) {
  Scene scene(photosClientEntitledTo(AllAccountsAccessEntitlement));
  scene.addAccount();
  scene.addRecord({.granted = false});
  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email"})), isGrant());
  EXPECT_EQ(scene.record(), RecordData{.granted = false});
}

TEST(AClientWithAnotherEntitlement, HasNoAccessByIt) {
  for (const char* entitlement : {"", "com.veltran.accounts.all-access2", "com.veltran.accounts.All-Access", "%@"}) {
    Scene scene(photosClientEntitledTo(entitlement));
    EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email"})), isRefusalWith(accountsError(6))) << entitlement;
  }
}

TEST(ADefaultAccessClientWithoutAnAccount, IsGrantedWithoutThePromptAndWithoutTheServer) {
  Scene scene(photosClientEntitledTo(FacebookDefaultAccessEntitlement));

  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email", "user_likes"})), isGrant());

  EXPECT_THAT(stepsOf(scene.platform.trace),
              ElementsAre(handling, "Client.hasEntitlement", "Client.hasEntitlement", defaultAccess,
                          "AccountStore.accountsWithAccountTypeIdentifier", "AuthorizationManager.authorizationForClient",
                          "Preferences.copyValue", "\"Skipping server request!\"", "AuthorizationManager.setAuthorization",
                          "completion"));
  EXPECT_EQ(scene.record(),
            (RecordData{.granted = true, .options = persistentOptions(), .permissions = PermissionSet{"email", "user_likes"}}));
}

TEST(ADefaultAccessClientWithAnAccount, IsSentToTheServerWithoutThePrompt) {
  Scene scene(photosClientEntitledTo(FacebookDefaultAccessEntitlement));
  scene.addAccount();
  scene.platform.social.authorizationAnswers = {serverGrants({"email"})};

  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email", "user_likes"})), isGrant());

  EXPECT_THAT(
      stepsOf(scene.platform.trace),
      ElementsAre(handling, "Client.hasEntitlement", "Client.hasEntitlement", defaultAccess,
                  "AccountStore.accountsWithAccountTypeIdentifier", "Account.setAccountType",
                  "AuthorizationManager.authorizationForClient", "Preferences.copyValue", "FacebookAuthorizationRequest.init",
                  "KeychainManager.credentialForAccount", "FacebookAuthorizationRequest.setAccessToken",
                  "FacebookAuthorizationRequest.performRequestWithHandler", "\"Access request response: %@\"",
                  "Account.setCredential", "KeychainManager.setCredentialForAccount", "AuthorizationManager.setAuthorization",
                  "completion"));
  EXPECT_EQ(scene.record()->permissions, PermissionSet{"email"});
}

TEST(ADefaultAccessClient, IsRefusedWithInvalidOptions) {
  Scene scene(photosClientEntitledTo(FacebookDefaultAccessEntitlement));
  EXPECT_THAT(scene.requestAccess(noAppID), isRefusalWith(accountsError(8)));
}

TEST(ADefaultAccessClient, IsRefusedAgainWhenItsRecordSaysRefused) {
  Scene scene(photosClientEntitledTo(FacebookDefaultAccessEntitlement));
  scene.addRecord({.granted = false, .options = persistentOptions()});
  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email"})), isRefusalWithoutError());
}

TEST(ADefaultAccessClientWithoutAnAccount, KeepsWhatItHeldBesideWhatIsNew) {
  Scene scene(photosClientEntitledTo(FacebookDefaultAccessEntitlement));
  scene.addRecord({.options = persistentOptions(), .permissions = PermissionSet{"email"}});
  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"user_likes"})), isGrant());
  EXPECT_EQ(scene.record()->permissions, (PermissionSet{"email", "user_likes"}));
}

TEST(AClientWithoutAnAccount, IsToldSoBeforeItsOptionsAreRead) {
  for (const auto& options : {std::optional<Dictionary>(), std::optional(noAppID), std::optional(optionsAskingFor({}))}) {
    Scene scene;
    scene.addRecord({.options = persistentOptions(), .permissions = PermissionSet{"email"}});

    EXPECT_THAT(scene.requestAccess(options), isRefusalWith(accountsError(6)));

    EXPECT_THAT(stepsOf(scene.platform.trace),
                ElementsAre(handling, "Client.hasEntitlement", "Client.hasEntitlement",
                            "AccountStore.accountsWithAccountTypeIdentifier",
                            "\"No Facebook accounts. Rejecting access request.\"", "completion"));
  }
}

TEST(AnAccountOfAnotherType, IsNoFacebookAccount) {
  Scene scene;
  scene.store->addAccount({.id = "other", .type = "com.veltran.accounttype.other"});
  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email"})), isRefusalWith(accountsError(6)));
}

TEST(ARequestWithAbsentOptions, IsInvalid) {
  Scene scene;
  scene.addAccount();

  EXPECT_THAT(scene.requestAccess(std::nullopt), isRefusalWith(accountsError(8)));

  EXPECT_THAT(
      stepsOf(scene.platform.trace),
      ElementsAre(handling, "Client.hasEntitlement", "Client.hasEntitlement", "AccountStore.accountsWithAccountTypeIdentifier",
                  "Account.setAccountType", "\"%@ provided an invalid options dictionary.\"", "completion"));
}

TEST(AnInvalidRequest, IsRefusedEvenWhenTheRecordSaysGranted) {
  Scene scene;
  scene.addAccount();
  const RecordData earlier{.options = persistentOptions(), .permissions = PermissionSet{"email"}};
  scene.addRecord(earlier);
  EXPECT_THAT(scene.requestAccess(noAppID), isRefusalWith(accountsError(8)));
  EXPECT_EQ(scene.record(), earlier);
}

TEST(AFirstRequest, IsDecidedByTheUserAndThenByTheServer) {
  Scene scene;
  scene.addAccount();
  scene.platform.alert.answers = {userAllows()};
  scene.platform.social.authorizationAnswers = {serverGrants({"email"})};

  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email", "user_likes"})), isGrant());

  EXPECT_THAT(
      stepsOf(scene.platform.trace),
      ElementsAre(handling, "Client.hasEntitlement", "Client.hasEntitlement", "AccountStore.accountsWithAccountTypeIdentifier",
                  "Account.setAccountType", "AuthorizationManager.authorizationForClient",
                  "\"Generating user message for permission: %@.\"", "SystemAlert.createAlert", "SystemAlert.receiveResponse",
                  "logAccessRequest", "Preferences.copyValue", "FacebookAuthorizationRequest.init",
                  "KeychainManager.credentialForAccount", "FacebookAuthorizationRequest.setAccessToken",
                  "FacebookAuthorizationRequest.performRequestWithHandler", "SystemAlert.releaseAlert",
                  "\"Access request response: %@\"", "Account.setCredential", "KeychainManager.setCredentialForAccount",
                  "AuthorizationManager.setAuthorization", "completion"));
  EXPECT_EQ(scene.record(),
            (RecordData{.granted = true, .options = persistentOptions(), .permissions = PermissionSet{"email"}}));
}

TEST(AFirstRequest, IsRefusedByTheUserAndTheRefusalIsWrittenDown) {
  Scene scene;
  scene.addAccount();
  scene.platform.alert.answers = {userRefuses()};

  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"publish"}, FacebookAudienceFriends)), isRefusalWith(accountsError(7)));

  EXPECT_THAT(stepsOf(scene.platform.trace),
              ElementsAre(handling, "Client.hasEntitlement", "Client.hasEntitlement",
                          "AccountStore.accountsWithAccountTypeIdentifier", "Account.setAccountType",
                          "AuthorizationManager.authorizationForClient", "\"Generating user message for permission: %@.\"",
                          "SystemAlert.createAlert", "SystemAlert.receiveResponse", "logAccessRequest", "Preferences.copyValue",
                          "AuthorizationManager.setAuthorization", "completion", "SystemAlert.releaseAlert"));
  EXPECT_EQ(scene.record(), (RecordData{.granted = false, .options = persistentOptions(FacebookAudienceFriends)}));
}

TEST(ARequest, PromptsAlsoWhenTheDaemonAllowsNoInteraction) {
  for (const bool allowUserInteraction : {true, false}) {
    Scene scene;
    scene.addAccount();
    scene.platform.alert.answers = {userAllows()};
    scene.platform.social.authorizationAnswers = {serverGrants({"email"})};
    EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email"}), allowUserInteraction), isGrant());
    EXPECT_THAT(scene.platform.trace.names(), Contains("SystemAlert.createAlert").Times(1));
  }
}

TEST(ARequest, TellsTheServerAppBundlePermissionsAndAudience) {
  Scene scene;
  scene.addAccount();
  scene.platform.alert.answers = {userAllows()};

  scene.requestAccess(optionsAskingFor({"publish", "email"}, FacebookAudienceOnlyMe, "app 7"));

  EXPECT_THAT(scene.platform.trace.named("FacebookAuthorizationRequest.init"),
              ElementsAre(::testing::Field(&Event::members, Dictionary{{"appID", "app 7"},
                                                                       {"bundleID", "org.example.photos"},
                                                                       {"permissions", tracedSet({"email", "publish"})},
                                                                       {"audience", "SELF"}})));
}

TEST(ARequest, UsesTheFirstOfTwoAccounts) {
  Scene scene;
  scene.addAccount("first");
  scene.addAccount("second");
  scene.platform.alert.answers = {userAllows()};
  scene.platform.social.authorizationAnswers = {serverGrants({"email"})};

  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email"})), isGrant());

  const auto& trace = scene.platform.trace;
  ASSERT_EQ(trace.named("Account.setAccountType").size(), 1U);
  EXPECT_EQ(trace.named("Account.setAccountType")[0].members,
            (Dictionary{{"account", Dictionary{{"$account", "first"}}}, {"accountType", AccountTypeIdentifierFacebook}}));
  EXPECT_EQ(trace.named("FacebookAuthorizationRequest.setAccessToken")[0]["token"], Value("master token of first"));
  EXPECT_NE(scene.platform.keychain.entry("first", "org.example.photos"), nullptr);
  EXPECT_EQ(scene.platform.keychain.entry("second", "org.example.photos"), nullptr);
}

TEST(TheAccountLookUp, AnswersNoneWithoutAnAccount) {
  Scene scene;
  EXPECT_EQ(scene.plugin->_accountOfType(scene.facebook, *scene.store), nullptr);
  EXPECT_THAT(scene.platform.trace.names(), ElementsAre("AccountStore.accountsWithAccountTypeIdentifier"));
  EXPECT_EQ(scene.platform.trace.events()[0]["identifier"], Value(AccountTypeIdentifierFacebook));
}

TEST(AnAnswer, ComesOnTheCallingThreadUnlessTheServerIsAsked) {
  Scene scene;
  scene.addAccount();
  scene.platform.alert.answers = {userRefuses(), userAllows()};
  scene.platform.social.authorizationAnswers = {serverGrants({"email"})};
  scene.addRecord({.options = persistentOptions(), .permissions = PermissionSet{"user_likes"}});

  scene.requestAccess(std::nullopt);
  scene.requestAccess(optionsAskingFor({"user_likes"}));
  scene.requestAccess(optionsAskingFor({"email"}));
  scene.requestAccess(optionsAskingFor({"email"}));

  std::vector<std::string> threads;
  for (const Event& completion : scene.platform.trace.named("completion")) threads.push_back(completion.thread);
  EXPECT_THAT(threads, ElementsAre("daemon", "daemon", "daemon", "request"));
}

}  // namespace
}  // namespace palisade
