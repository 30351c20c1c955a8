// What an access request writes into the log, word by word.

#include <functional>
#include <ostream>
#include <string>
#include <vector>

#include <gmock/gmock.h>

#include "Tests/Unit/Support/Scene.h"

namespace palisade {
namespace {

using ::testing::ElementsAre;
using ::testing::ElementsAreArray;
using ::testing::Field;
using ::testing::IsEmpty;

constexpr const char* request =
    "handleAccessRequestToAccountsOfType:forClient:withOptions:store:allowUserInteraction:completion:";
constexpr const char* message = "_constructUserMessageForPermissions:audience:appName:account:";
constexpr const char* prompt = "_promptUserToApproveRequestForPermissions:withAudience:fromClient:account:completion:";
constexpr const char* response =
    "_handleUserResponse:toRequestForClient:withAppID:persistentOptions:onAccount:ofType:existingPermissions:newPermissions:"
    "audience:isFirstTimeRequest:shouldSkipServer:store:completion:";

constexpr const char* photos = "org.example.photos (Photos)";

const LogLine isHandling{7, request, "Palisade is handling request for access from %@.", {photos}, "client"};
const LogLine asksForEmail{7, message, "Generating user message for permission: %@.", {"{email}"}, "permissions"};

struct Situation {
  const char* name;
  FakeClientData client;
  std::function<void(Scene&)> prepare;
  std::optional<Dictionary> options;
  std::vector<LogLine> lines;
};

void PrintTo(const Situation& situation, std::ostream* stream) { *stream << situation.name; }

class ARequestsLog : public ::testing::TestWithParam<Situation> {};

TEST_P(ARequestsLog, ReadsWordByWord) {
  const auto& [name, client, prepare, options, lines] = GetParam();
  Scene scene(client);
  prepare(scene);
  scene.requestAccess(options);
  EXPECT_THAT(logLines(scene.platform.trace), ElementsAreArray(lines));
}

void nothing(Scene&) {}
void anAccount(Scene& scene) { scene.addAccount(); }

void ignoredRequests(Scene& scene) {
  scene.addAccount();
  scene.platform.preferences.set(FacebookIgnoreAccessRequests, FacebookPreferencesAppID, true);
}

const std::vector<Situation> situations = {
    {"WithAllAccountsAccess", photosClientEntitledTo(AllAccountsAccessEntitlement), nothing, std::nullopt, {isHandling}},
    {"WithoutAnAccount",
     photosClient(),
     nothing,
     optionsAskingFor({"email"}),
     {isHandling, {3, request, "No Facebook accounts. Rejecting access request.", {}, ""}}},
    {"WithInvalidOptions",
     photosClient(),
     anAccount,
     std::nullopt,
     {isHandling, {3, request, "%@ provided an invalid options dictionary.", {photos}, "client"}}},
    {"OfARefusedClient",
     photosClient(),
     [](Scene& scene) {
       scene.addAccount();
       scene.addRecord({.granted = false});
     },
     optionsAskingFor({"email"}),
     {isHandling}},
    {"CoveredByAnEarlierGrant",
     photosClient(),
     [](Scene& scene) {
       scene.addAccount();
       scene.addRecord({.options = persistentOptions(), .permissions = PermissionSet{"email"}});
     },
     optionsAskingFor({"email"}),
     {isHandling}},
    {"WithDefaultAccessAndWithoutAnAccount",
     photosClientEntitledTo(FacebookDefaultAccessEntitlement),
     nothing,
     optionsAskingFor({"email"}),
     {isHandling,
      {7, request, "Granting default access to %@.", {photos}, "client"},
      {5, response, "Skipping server request!", {}, ""}}},
    {"WithDefaultAccessAndInvalidOptions",
     photosClientEntitledTo(FacebookDefaultAccessEntitlement),
     nothing,
     std::nullopt,
     {isHandling,
      {7, request, "Granting default access to %@.", {photos}, "client"},
      {3, request, "%@ provided an invalid options dictionary.", {photos}, "client"}}},
    {"ThatTheUserRefuses", photosClient(), anAccount, optionsAskingFor({"email"}), {isHandling, asksForEmail}},
    {"WhileRequestsAreIgnored",
     photosClient(),
     ignoredRequests,
     optionsAskingFor({"email"}),
     {isHandling,
      asksForEmail,
      {5, response, "Will not contact server about this access request due to user-set pref.", {}, ""}}},
    {"ForSomethingThatNobodyCanDescribe",
     photosClient(),
     [](Scene& scene) {
       scene.addAccount();
       scene.platform.social.descriptionAnswers = {{.data = R"("API_EC_PARAM")"}};
     },
     optionsAskingFor({"future"}),
     {isHandling,
      {7, message, "Generating user message for permission: %@.", {"{future}"}, "permissions"},
      {7, message, "Unknown permissions were requested!", {}, ""},
      {7,
       "_fetchDescriptionForUnknownPermissions:audience:account:",
       "Server description for %@ was: %@",
       {"{future}", "API_EC_PARAM"},
       "permissions, description"},
      {7, message, "Something went wrong and we ended up with a nil user message. Falling back to default.", {}, ""},
      {3, prompt, "Something really bad happened and we ended up with an invalid message", {}, ""}}},
};

INSTANTIATE_TEST_SUITE_P(, ARequestsLog, ::testing::ValuesIn(situations), nameOfCase<Situation>);

Dictionary auditOf(Value bundleID, bool granted) {
  return {{"accountType", AccountTypeIdentifierFacebook},
          {"bundleID", std::move(bundleID)},
          {"granted", granted},
          {"userPrompted", true},
          {"elapsed", 0.0}};
}

TEST(TheAccessRequestRecord, TellsTheUsersAnswer) {
  for (const bool userAllowed : {true, false}) {
    Scene scene;
    scene.addAccount();
    scene.platform.alert.answers = {userAllowed ? userAllows() : userRefuses()};
    scene.platform.social.authorizationAnswers = {serverGrants({"email"})};
    scene.requestAccess(optionsAskingFor({"email"}));
    EXPECT_THAT(scene.platform.trace.named("logAccessRequest"),
                ElementsAre(Field(&Event::members, auditOf("org.example.photos", userAllowed))));
  }
}

TEST(TheAccessRequestRecord, TellsTheUsersAnswerAlsoWhenTheRequestComesToNothing) {
  Scene scene;
  ignoredRequests(scene);
  scene.platform.alert.answers = {userAllows()};
  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email"})), isRefusalWithoutError());
  EXPECT_THAT(scene.platform.trace.named("logAccessRequest"),
              ElementsAre(Field(&Event::members, auditOf("org.example.photos", true))));
}

TEST(TheAccessRequestRecord, IsWrittenAlsoWhenNoMessageCouldBeShown) {
  Scene scene;
  scene.addAccount();
  scene.requestAccess(optionsAskingFor({"future"}));
  EXPECT_THAT(scene.platform.trace.named("logAccessRequest"),
              ElementsAre(Field(&Event::members, auditOf("org.example.photos", false))));
}

TEST(TheAccessRequestRecord, NamesNoBundleOfAClientWithoutOne) {
  Scene scene({.id = "tool", .appName = "Tool"});
  scene.addAccount();
  scene.requestAccess(optionsAskingFor({"email"}));
  EXPECT_THAT(scene.platform.trace.named("logAccessRequest"), ElementsAre(Field(&Event::members, auditOf(Value(), false))));
}

TEST(TheAccessRequestRecord, IsNotWrittenForRequestsThatPromptNobody) {
  for (const auto& entitlement : {AllAccountsAccessEntitlement, FacebookDefaultAccessEntitlement}) {
    Scene scene(photosClientEntitledTo(entitlement));
    scene.addAccount();
    scene.platform.social.authorizationAnswers = {serverGrants({"email"})};
    EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email"})), isGrant());
    EXPECT_THAT(scene.platform.trace.named("logAccessRequest"), IsEmpty());
  }
  Scene scene;
  scene.addAccount();
  scene.addRecord({.options = persistentOptions(), .permissions = PermissionSet{"email"}});
  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email"})), isGrant());
  EXPECT_THAT(scene.platform.trace.named("logAccessRequest"), IsEmpty());
}

TEST(ALogThatKeepsErrorsOnly, ChangesNoAnswer) {
  Scene scene;
  scene.platform.log.enableUpTo(LogLevel::error);
  scene.addAccount();
  scene.platform.alert.answers = {userAllows()};
  scene.platform.social.authorizationAnswers = {serverGrants({"email"})};
  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email"})), isGrant());
  EXPECT_THAT(logLines(scene.platform.trace), IsEmpty());
}

}  // namespace
}  // namespace palisade
