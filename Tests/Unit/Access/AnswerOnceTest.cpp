// One answer for each operation, whatever the server's side or the daemon's completion does.

#include <functional>
#include <ostream>
#include <stdexcept>
#include <string>
#include <vector>

#include <gmock/gmock.h>

#include "Tests/Unit/Access/EagerSocialFramework.h"
#include "Tests/Unit/Support/Scene.h"

namespace palisade {
namespace {

using ::testing::Contains;
using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::Field;
using ::testing::IsEmpty;
using ::testing::Not;
using ::testing::SizeIs;
using ::testing::StartsWith;

const RecordData refusedRecord{.granted = false, .options = persistentOptions()};
const RecordData grantedEmail{.options = persistentOptions(), .permissions = PermissionSet{"email"}};

const Error refusalForADroppedCallback =
    accountsError(99, "The access decision failed unexpectedly: a service dropped its callback without calling it");

struct SceneWithAnAllowingUser : Scene {
  SceneWithAnAllowingUser() {
    addAccount();
    platform.alert.answers = {userAllows()};
  }
};

TEST(AServerThatAnswersTwice, IsHeardOnceByARequest) {
  SceneWithAnAllowingUser scene;
  scene.platform.social.authorizationAnswers = {serverGrants({"email"}, Delivery::twice)};
  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email"})), isGrant());
  EXPECT_THAT(scene.platform.trace.named("KeychainManager.setCredentialForAccount"), SizeIs(1));
  EXPECT_THAT(scene.platform.trace.named("AuthorizationManager.setAuthorization"), SizeIs(1));
}

TEST(AServerThatAnswersTwice, IsHeardOnceByADirectAuthorization) {
  Scene scene;
  scene.addAccount();
  scene.addRecord(refusedRecord);
  scene.platform.social.authorizationAnswers = {serverGrants({"email"}, Delivery::twice)};
  EXPECT_THAT(scene.authorize(), isGrant());
  EXPECT_THAT(scene.platform.trace.named("KeychainManager.setCredentialForAccount"), SizeIs(1));
  EXPECT_EQ(scene.record(), grantedEmail);
}

TEST(AServerThatAnswersTwice, IsHeardOnceByThePrompt) {
  SceneWithAnAllowingUser scene;
  scene.platform.alert.answers = {userRefuses()};
  scene.platform.social.descriptionAnswers = {{.data = R"("see the future")", .delivery = Delivery::twice}};
  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"future"})), isRefusalWith(accountsError(7)));
  EXPECT_THAT(scene.platform.trace.named("SystemAlert.createAlert"), SizeIs(1));
}

TEST(AnAnswerThatIsDropped, RefusesTheRequest) {
  SceneWithAnAllowingUser scene;
  scene.platform.social.authorizationAnswers = {{.delivery = Delivery::dropped}};

  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email"})), isRefusalWith(refusalForADroppedCallback));

  EXPECT_EQ(scene.record(), std::nullopt);
  EXPECT_THAT(
      logLines(scene.platform.trace),
      Contains(LogLine{3,
                       "handleAccessRequestToAccountsOfType:forClient:withOptions:store:allowUserInteraction:completion:",
                       "The access decision failed unexpectedly: %@",
                       {"a service dropped its callback without calling it"},
                       "failure"}));
}

TEST(AnAnswerThatIsDropped, RefusesADirectAuthorizationThatWaitsForIt) {
  Scene scene;
  scene.addAccount();
  scene.addRecord(refusedRecord);
  scene.platform.social.authorizationAnswers = {{.delivery = Delivery::dropped}};
  EXPECT_THAT(scene.authorize(), isUnexpectedFailureAnswer());
  EXPECT_EQ(scene.record(), refusedRecord);
}

TEST(AnAnswerThatIsDropped, RefusesAPromptThatWaitsForItsWords) {
  SceneWithAnAllowingUser scene;
  scene.platform.social.descriptionAnswers = {{.delivery = Delivery::dropped}};
  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email", "future"})), isUnexpectedFailureAnswer());
  EXPECT_EQ(scene.record(), std::nullopt);
  EXPECT_THAT(scene.platform.trace.names(), Each(Not(StartsWith("SystemAlert."))));
}

TEST(AnAnswerThatComesInsideTheCall, EndsTheRequestBeforeItsAlertIsReleased) {
  SceneWithAnAllowingUser scene;
  scene.platform.social.authorizationAnswers = {serverGrants({"email"}, Delivery::inLine)};

  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email"})), isGrant());

  const std::vector<std::string> steps = stepsOf(scene.platform.trace);
  ASSERT_GE(steps.size(), 3U);
  EXPECT_THAT(std::vector(steps.end() - 3, steps.end()),
              ElementsAre("AuthorizationManager.setAuthorization", "completion", "SystemAlert.releaseAlert"));
  EXPECT_THAT(scene.platform.trace.named("completion"), ElementsAre(Field(&Event::thread, "daemon")));
  EXPECT_EQ(scene.record(), grantedEmail);
}

TEST(AnAnswerThatCameOnAnotherThreadBeforeTheCallReturned, EndsTheRequestThere) {
  SceneWithAnAllowingUser scene;
  EagerSocialFramework eager(scene.platform);
  PlatformServices services = scene.platform.services();
  services.social = &eager;
  const auto plugin = std::make_shared<PluginUnderTest>(services);
  scene.platform.social.authorizationAnswers = {serverGrants({"email"})};
  scene.platform.social.descriptionAnswers = {{.data = R"("see the future")"}};
  const auto options = std::make_shared<const Dictionary>(optionsAskingFor({"email", "future"}));

  EXPECT_THAT(scene.performHere([&](const AccessCompletion& completion) {
    plugin->handleAccessRequestToAccountsOfType(scene.facebook, scene.client, options, scene.store, true, completion);
  }),
              isGrant());

  EXPECT_THAT(scene.platform.trace.named("completion"), ElementsAre(Field(&Event::thread, "request")));
  EXPECT_EQ(scene.record(), grantedEmail);
}

// An operation of the daemon's interface with a completion of the test's own.
struct Operation {
  const char* name;
  FakeClientData client;
  std::function<void(Scene&, AccessCompletion)> perform;
};

void PrintTo(const Operation& operation, std::ostream* stream) { *stream << operation.name; }

std::function<void(Scene&, AccessCompletion)> requestOf(std::optional<Dictionary> options) {
  return [options = std::move(options)](Scene& scene, AccessCompletion completion) {
    scene.plugin->handleAccessRequestToAccountsOfType(scene.facebook, scene.client,
                                                      options ? std::make_shared<const Dictionary>(*options) : nullptr,
                                                      scene.store, true, std::move(completion));
  };
}

const Operation operations[] = {
    {"AGrantByTheServer", photosClient(), requestOf(optionsAskingFor({"user_likes"}))},
    {"ACoveredRequest", photosClient(), requestOf(optionsAskingFor({"email"}))},
    {"AnInvalidRequest", photosClient(), requestOf(std::nullopt)},
    {"AllAccountsAccess", photosClientEntitledTo(AllAccountsAccessEntitlement), requestOf(std::nullopt)},
    {"ADirectAuthorization", photosClient(),
     [](Scene& scene, AccessCompletion completion) {
       scene.plugin->authorizeAccessToAccountsOfType(scene.facebook, scene.client, scene.store, std::move(completion));
     }},
    {"ARevocation", photosClient(),
     [](Scene& scene, AccessCompletion completion) {
       scene.plugin->revokeAccessToAccountsOfType(scene.facebook, scene.client, scene.store, std::move(completion));
     }},
    {"ARevocationOfAll", photosClient(),
     [](Scene& scene, AccessCompletion completion) {
       scene.plugin->revokeAllAccessToAccountsOfType(scene.facebook, scene.store, std::move(completion));
     }},
};

class ACompletion : public ::testing::TestWithParam<Operation> {
 protected:
  ACompletion() : _scene(GetParam().client) {
    _scene.addAccount();
    _scene.addRecord(grantedEmail);
    _scene.platform.alert.answers = {userAllows()};
    _scene.platform.social.authorizationAnswers = {serverGrants({"email"})};
  }

  OperationEnd performWith(AccessCompletion completion) {
    return _scene.platform.run([&] { GetParam().perform(_scene, std::move(completion)); });
  }

  std::vector<std::string> loggedFailures() const {
    std::vector<std::string> failures;
    for (const LogLine& line : logLines(_scene.platform.trace)) {
      if (line.format == "The access decision failed unexpectedly: %@") failures.push_back(line.arguments.at(0));
    }
    return failures;
  }

  Scene _scene;
};

TEST_P(ACompletion, ThatThrowsIsNotCalledAgain) {
  int calls = 0;
  EXPECT_EQ(performWith([&calls](bool, const std::optional<Error>&) {
              ++calls;
              throw std::runtime_error("the daemon is not well");
            }),
            OperationEnd::returned);
  EXPECT_EQ(calls, 1);
  EXPECT_THAT(loggedFailures(), ElementsAre("the daemon is not well"));
  EXPECT_EQ(_scene.platform.alert.standingAlerts(), 0U);
}

TEST_P(ACompletion, ThatThrowsNoStandardExceptionIsNotCalledAgainEither) {
  int calls = 0;
  EXPECT_EQ(performWith([&calls](bool, const std::optional<Error>&) {
              ++calls;
              throw "nothing standard";
            }),
            OperationEnd::returned);
  EXPECT_EQ(calls, 1);
  EXPECT_THAT(loggedFailures(), ElementsAre("an exception of an unknown type"));
}

TEST_P(ACompletion, ThatIsMissingEndsInTheLog) {
  EXPECT_EQ(performWith(nullptr), OperationEnd::returned);
  EXPECT_THAT(loggedFailures(), SizeIs(1));
}

TEST_P(ACompletion, IsLetGoOfOnceItWasCalled) {
  auto kept = std::make_shared<int>(0);
  EXPECT_EQ(performWith([kept](bool, const std::optional<Error>&) {}), OperationEnd::returned);
  EXPECT_EQ(kept.use_count(), 1);
}

TEST_P(ACompletion, MayCallThePlugInAgain) {
  std::vector<bool> answers;
  EXPECT_EQ(performWith([&](bool, const std::optional<Error>&) {
              _scene.plugin->revokeAccessToAccountsOfType(
                  _scene.facebook, _scene.client, _scene.store,
                  [&](bool granted, const std::optional<Error>&) { answers.push_back(granted); });
            }),
            OperationEnd::returned);
  EXPECT_THAT(answers, ElementsAre(true));
}

INSTANTIATE_TEST_SUITE_P(, ACompletion, ::testing::ValuesIn(operations), nameOfCase<Operation>);

}  // namespace
}  // namespace palisade
