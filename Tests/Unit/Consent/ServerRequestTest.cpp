// The request for a client's token: what is sent, in which order, and what happens when it cannot be signed or sent.

#include <gmock/gmock.h>

#include "Testing/TraceValue.h"
#include "Tests/Unit/Consent/ConsentScene.h"

namespace palisade {
namespace {

using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::Not;
using ::testing::SizeIs;

constexpr const char* exchange = "_getServerAuthorizationForClient:withAppID:permissions:audience:account:completion:";

class TheRequestForAToken : public ::testing::Test, protected ConsentScene {};

TEST_F(TheRequestForAToken, IsMadeSignedAndSentAndItsAnswerStoredBeforeAnybodyIsToldOfIt) {
  serverAnswers(serverIssues("client token", R"(["email"])"));

  EXPECT_THAT(askServer(permissionSet({"user_likes", "email"}), std::string(FacebookAudienceOnlyMe)), SizeIs(1));

  EXPECT_THAT(
      platform.trace.names(),
      ElementsAre("FacebookAuthorizationRequest.init", "KeychainManager.credentialForAccount",
                  "FacebookAuthorizationRequest.setAccessToken", "FacebookAuthorizationRequest.performRequestWithHandler",
                  "log", "Account.setCredential", "KeychainManager.setCredentialForAccount", "answered"));
  const std::vector<Event> events = platform.trace.events();
  EXPECT_EQ(events[0].members, (Dictionary{{"appID", photosAppID},
                                           {"bundleID", "org.example.photos"},
                                           {"permissions", traceSet(permissionSet({"email", "user_likes"}))},
                                           {"audience", "SELF"}}));
  EXPECT_EQ(events[1].members, (Dictionary{{"account", traceAccount(account.get())}, {"clientID", nullptr}}));
  EXPECT_EQ(events[2].members, (Dictionary{{"token", "master token of me"}}));
}

TEST_F(TheRequestForAToken, KnowsTheServersWordForEachAudienceAndNoneForAnythingElse) {
  const std::pair<std::optional<std::string>, std::optional<std::string>> words[] = {
      {std::string(FacebookAudienceEveryone), "EVERYONE"},
      {std::string(FacebookAudienceFriends), "ALL_FRIENDS"},
      {std::string(FacebookAudienceOnlyMe), "SELF"},
      {std::nullopt, std::nullopt},
      {"", std::nullopt},
      {"EVERYONE", std::nullopt},
      {"facebookaudienceeveryone", std::nullopt},
      {"FacebookAudienceFriends ", std::nullopt},
      {"FacebookAudience", std::nullopt},
  };
  for (const auto& [audience, word] : words) {
    EXPECT_EQ(plugin->_serverAudienceStringForAudience(audience), word);

    platform.trace.clear();
    askServer(permissionSet({"publish"}), audience);
    EXPECT_THAT(members(platform.trace, "FacebookAuthorizationRequest.init", "audience"), ElementsAre(traceText(word)));
  }
}

TEST_F(TheRequestForAToken, MayNameNoPermissions) {
  askServer(nullptr);
  askServer(permissionSet({}));

  EXPECT_THAT(members(platform.trace, "FacebookAuthorizationRequest.init", "permissions"),
              ElementsAre(Value(), traceSet(permissionSet({}))));
}

TEST_F(TheRequestForAToken, IsSentWithoutWaitingForItsAnswer) {
  serverAnswers({.delivery = Delivery::never});

  EXPECT_THAT(askServer(), IsEmpty());
  EXPECT_EQ(platform.trace.names().back(), "FacebookAuthorizationRequest.performRequestWithHandler");
}

TEST_F(TheRequestForAToken, IsAnsweredOnTheThreadThatBringsTheAnswer) {
  serverAnswers(serverIssues("client token", "[]"));

  const std::vector<ServerAuthorization> answers = askServer();

  ASSERT_THAT(answers, SizeIs(1));
  EXPECT_EQ(answers.front().thread, nameOf(ThreadLabel::request));
}

TEST_F(TheRequestForAToken, IsAnsweredOnceHoweverOftenTheServerAnswers) {
  ServerAnswer answer = serverIssues("client token", "[]");
  answer.delivery = Delivery::twice;
  serverAnswers(answer);

  EXPECT_THAT(askServer(), SizeIs(1));
  EXPECT_THAT(platform.trace.named("KeychainManager.setCredentialForAccount"), SizeIs(1));
}

TEST_F(TheRequestForAToken, MayBeAnsweredBeforeItHasBeenSent) {
  ServerAnswer answer = serverIssues("client token", R"(["email"])");
  answer.delivery = Delivery::inLine;
  serverAnswers(answer);

  EXPECT_THAT(askServer(), ElementsAre(isServerGrant(Array{"email"})));
}

TEST_F(TheRequestForAToken, KeepsThePluginTheClientAndTheAccountAliveUntilItIsAnswered) {
  serverAnswers(serverIssues("client token", R"(["email"])"));
  const auto calls = std::make_shared<std::vector<ServerAuthorization>>();
  auto shortLived = std::make_shared<PluginUnderTest>(platform.services());
  std::shared_ptr<const Client> shortLivedClient = platform.makeClient(photosClient());
  auto shortLivedAccount = makeAccount("other");
  const std::weak_ptr<PluginUnderTest> watched = shortLived;

  shortLived->_getServerAuthorizationForClient(shortLivedClient, photosAppID, permissionSet({"email"}), std::nullopt,
                                               shortLivedAccount, remembering(calls));
  shortLived.reset();
  shortLivedClient.reset();
  shortLivedAccount.reset();
  EXPECT_FALSE(watched.expired());
  ASSERT_TRUE(platform.deliveries.deliverNext());

  EXPECT_THAT(*calls, ElementsAre(isServerGrant(Array{"email"})));
  EXPECT_NE(platform.keychain.entry("other", "org.example.photos"), nullptr);
  EXPECT_TRUE(watched.expired());
}

// The client's description is a format on purpose.
class AClientWithoutABundleID : public ::testing::Test, protected ConsentScene {
 protected:
  AClientWithoutABundleID() : ConsentScene({.id = "script", .appName = "Script", .description = "/usr/bin/script %@"}) {}
};

TEST_F(AClientWithoutABundleID, IsRefusedBeforeAnyKeychainReadAndAnyRequest) {
  const auto refusal =
      accountsError(16, "Cannot obtain server authorization for client /usr/bin/script %@ because it has no bundle ID.");

  EXPECT_THAT(askServer(), ElementsAre(isServerRefusal(refusal)));

  EXPECT_THAT(platform.trace.names(), ElementsAre("answered"));
}

TEST_F(AClientWithoutABundleID, IsAnsweredOnTheCallersThread) {
  const std::vector<ServerAuthorization> answers = askServer();

  ASSERT_THAT(answers, SizeIs(1));
  EXPECT_EQ(answers.front().thread, nameOf(ThreadLabel::daemon));
}

TEST(AClientWithAnEmptyBundleID, IsAskedForLikeAnyOther) {
  ConsentScene scene({.id = "odd", .bundleID = ""});
  scene.serverAnswers(serverIssues("client token", "[]"));

  EXPECT_THAT(scene.askServer(), ElementsAre(isServerGrant(Array())));
  EXPECT_THAT(members(scene.platform.trace, "FacebookAuthorizationRequest.init", "bundleID"), ElementsAre(Value("")));
}

class AMissingMasterToken : public ::testing::Test, protected ConsentScene {
 protected:
  const LogLine complaint{.level = 3,
                          .operation = exchange,
                          .format = "Could not get the master token for account %@ to sign the access request.",
                          .arguments = {"account me"},
                          .argumentNames = "account"};

  // How the request was signed, after the complaint and before it was sent.
  void expectSentWith(const Value& token) {
    EXPECT_THAT(askServer(), ElementsAre(isServerGrant(Array())));

    EXPECT_THAT(
        platform.trace.names(),
        ElementsAre("FacebookAuthorizationRequest.init", "KeychainManager.credentialForAccount", "log",
                    "FacebookAuthorizationRequest.setAccessToken", "FacebookAuthorizationRequest.performRequestWithHandler",
                    "log", "Account.setCredential", "KeychainManager.setCredentialForAccount", "answered"));
    EXPECT_EQ(logLines(platform.trace).front(), complaint);
    EXPECT_THAT(members(platform.trace, "FacebookAuthorizationRequest.setAccessToken", "token"), ElementsAre(token));
  }
};

TEST_F(AMissingMasterToken, ThatIsEmptyIsLoggedOnceAndSentAllTheSame) {
  platform.keychain.addCredential("me", std::nullopt, "");
  serverAnswers(serverIssues("client token", "[]"));
  expectSentWith("");
}

TEST_F(AMissingMasterToken, OfACredentialWithoutOneIsLoggedOnceAndSentAllTheSame) {
  platform.keychain.addCredential("me", std::nullopt, std::nullopt);
  serverAnswers(serverIssues("client token", "[]"));
  expectSentWith(nullptr);
}

TEST_F(AMissingMasterToken, OfAnAccountWithoutACredentialIsLoggedOnceAndSentAllTheSame) {
  platform.keychain.removeCredentialForAccount(account, std::nullopt);
  platform.trace.clear();
  serverAnswers(serverIssues("client token", "[]"));
  expectSentWith(nullptr);
}

TEST_F(AMissingMasterToken, IsNotFoundUnderTheClientsOwnID) {
  platform.keychain.removeCredentialForAccount(account, std::nullopt);
  platform.keychain.addCredential("me", "org.example.photos", "client's earlier token");

  EXPECT_EQ(plugin->_masterTokenForAccount(account), std::nullopt);
}

class AServerThatCannotBeReached : public ::testing::Test, protected ConsentScene {};

TEST_F(AServerThatCannotBeReached, RefusesWithTheTransportsErrorAsItCame) {
  const Error error{.domain = "org.example.network",
                    .code = -3,
                    .description = "No route to %@",
                    .furtherInfo = {{"host", "graph.example.org"}, {"attempts", 3}}};
  const std::pair<ServerAnswer, std::optional<Error>> cases[] = {
      {{.error = error}, error},
      {{.data = R"({"access_token": "T"})", .error = error}, error},
      {{}, std::nullopt},
  };
  for (const auto& [answer, passedOn] : cases) {
    serverAnswers(answer);
    platform.trace.clear();

    EXPECT_THAT(askServer(), ElementsAre(isServerRefusal(passedOn)));

    EXPECT_THAT(logLines(platform.trace),
                ElementsAre(LogLine{.level = 3,
                                    .operation = exchange,
                                    .format = "Error contacting Facebook server for access authorization: %@",
                                    .arguments = {passedOn ? "org.example.network -3: No route to %@" : "(null)"},
                                    .argumentNames = "error"}));
    EXPECT_THAT(platform.trace.names(), Not(Contains("Account.setCredential")));
  }
}

}  // namespace
}  // namespace palisade
