// Every platform call of every operation made to throw, one after the other.
//
// Whatever fails, the completion is called exactly once and nobody is left waiting. A failure before the record is stored or
// the request is answered is a refusal that says so. What fails afterwards changes nothing any more.

#include <functional>
#include <ostream>
#include <string>
#include <vector>

#include <gmock/gmock.h>

#include "Tests/Unit/Access/FreshProcess.h"
#include "Tests/Unit/Support/Scene.h"

namespace palisade {
namespace {

using ::testing::Contains;
using ::testing::FieldsAre;

struct Situation {
  const char* name;
  std::function<void(Scene&)> prepare;
  std::function<CompletionCall(Scene&)> perform;
  FakeClientData client = photosClient();
};

void PrintTo(const Situation& situation, std::ostream* stream) { *stream << situation.name; }

auto requestFor(Array permissions, std::optional<std::string_view> audience = std::nullopt) {
  return [options = optionsAskingFor(std::move(permissions), audience)](Scene& scene) { return scene.requestAccess(options); };
}

std::function<void(Scene&)> withTheUserAllowing(Delivery delivery) {
  return [delivery](Scene& scene) {
    scene.addAccount();
    scene.platform.alert.answers = {userAllows()};
    scene.platform.social.authorizationAnswers = {serverGrants({"email"}, delivery)};
    scene.platform.social.descriptionAnswers = {{.data = R"("see the future")", .delivery = delivery}};
  };
}

void withTheUserRefusing(Scene& scene) {
  scene.addAccount();
  scene.platform.alert.answers = {userRefuses()};
}

std::function<void(Scene&)> withARecord(RecordData record, Delivery delivery = Delivery::onThread) {
  return [record, delivery](Scene& scene) {
    withTheUserAllowing(delivery)(scene);
    scene.addRecord(record);
  };
}

void withTwoRecords(Scene& scene) {
  withTheUserAllowing(Delivery::onThread)(scene);
  scene.addRecord({.options = persistentOptions(), .permissions = PermissionSet{"email"}});
  scene.addRecord({.options = persistentOptions()}, scene.platform.makeClient({.id = "other", .bundleID = "org.other"}));
}

const RecordData grantOfEmail{.options = persistentOptions(), .permissions = PermissionSet{"email"}};
const auto authorize = [](Scene& scene) { return scene.authorize(); };
const auto revoke = [](Scene& scene) { return scene.revoke(); };
const auto revokeAll = [](Scene& scene) { return scene.revokeAll(); };
const auto noPreparation = [](Scene&) {};

const std::vector<Situation> situations = {
    {"AConsentThatTheServerFulfils", withTheUserAllowing(Delivery::onThread), requestFor({"email", "user_likes"})},
    {"AConsentThatTheServerFulfilsAtOnce", withTheUserAllowing(Delivery::inLine), requestFor({"email"})},
    {"AConsentToEveryKindOfPermission", withTheUserAllowing(Delivery::onThread),
     requestFor({"email", "friends_likes", "publish", "manage_pages", "create_event", "future"}, FacebookAudienceFriends)},
    {"AConsentToAnUnknownPermission", withTheUserAllowing(Delivery::onThread), requestFor({"future"})},
    {"AConsentToAnUnknownPermissionDescribedAtOnce", withTheUserAllowing(Delivery::inLine), requestFor({"future"})},
    {"AConsentThatTheServerDoesNotFulfil",
     [](Scene& scene) {
       withTheUserAllowing(Delivery::onThread)(scene);
       scene.platform.social.authorizationAnswers = {{.data = R"({"error_msg": "no"})"}};
     },
     requestFor({"email"})},
    {"AConsentThatDoesNotReachTheServer",
     [](Scene& scene) {
       withTheUserAllowing(Delivery::onThread)(scene);
       scene.platform.social.authorizationAnswers = {serverCannotBeReached()};
     },
     requestFor({"email"})},
    {"DefaultAccessWithoutAnAccount", noPreparation, requestFor({"email"}),
     photosClientEntitledTo(FacebookDefaultAccessEntitlement)},
    {"DefaultAccessWithAnAccount", withTheUserAllowing(Delivery::onThread), requestFor({"email"}),
     photosClientEntitledTo(FacebookDefaultAccessEntitlement)},
    {"AllAccountsAccess", noPreparation, requestFor({"email"}), photosClientEntitledTo(AllAccountsAccessEntitlement)},
    {"ARefusal", withTheUserRefusing, requestFor({"email"})},
    {"ARefusedExtension",
     [](Scene& scene) {
       withTheUserRefusing(scene);
       scene.addRecord(grantOfEmail);
     },
     requestFor({"user_likes"})},
    {"ACoveredRequest", withARecord(grantOfEmail), requestFor({"email"})},
    {"ARequestOfARefusedClient", withARecord({.granted = false}), requestFor({"email"})},
    {"AnInvalidRequest", withTheUserAllowing(Delivery::onThread),
     [](Scene& scene) { return scene.requestAccess(std::nullopt); }},
    {"ARequestWithoutAnAccount", noPreparation, requestFor({"email"})},
    {"ARequestThatIsIgnored",
     [](Scene& scene) {
       withTheUserAllowing(Delivery::onThread)(scene);
       scene.platform.preferences.set(FacebookIgnoreAccessRequests, FacebookPreferencesAppID, true);
     },
     requestFor({"email"})},
    {"ARevocation", withARecord(grantOfEmail), revoke},
    {"ARevocationOfAnUnknownClient", withTheUserRefusing, revoke},
    {"ARevocationOfAll", withTwoRecords, revokeAll},
    {"ARevocationOfAllWithoutAnAccount", noPreparation, revokeAll},
    {"ADirectAuthorization", withARecord({.granted = false, .options = persistentOptions()}), authorize},
    {"ADirectAuthorizationAnsweredAtOnce", withARecord({.granted = false, .options = persistentOptions()}, Delivery::inLine),
     authorize},
    {"ADirectAuthorizationOfAnUnknownClient", withTheUserRefusing, authorize},
};

class InEverySituation : public ::testing::TestWithParam<Situation> {
 protected:
  struct Run {
    CompletionCall answer;
    bool answeredBeforeTheFault = false;
    bool storedBeforeTheFault = false;
    std::optional<std::string> fault;
    std::optional<RecordData> recordBefore;
    std::optional<RecordData> recordAfter;
    std::vector<std::string> steps;
  };

  // All runs share one platform, so that the process-wide preferences queue is one of its services and fails with them.
  static Run run(FakePlatform& platform, const std::function<void(FaultInjector&)>& order) {
    const Situation& situation = GetParam();
    platform.faults.clear();
    platform.trace.clear();
    platform.preferences.set(FacebookIgnoreAccessRequests, FacebookPreferencesAppID, std::nullopt);
    Scene scene(situation.client, platform);
    situation.prepare(scene);
    Run run;
    run.recordBefore = scene.record();
    const std::size_t earlier = platform.completions().size();
    platform.faults.raiseWith([&](const std::string& fault) {
      if (!run.fault) {
        run.answeredBeforeTheFault = platform.completions().size() > earlier;
        run.storedBeforeTheFault = !platform.trace.named("AuthorizationManager.setAuthorization").empty();
        run.fault = fault;
      }
      throw InjectedFault(fault);
    });
    order(platform.faults);
    run.answer = situation.perform(scene);
    run.recordAfter = scene.record();
    run.steps = stepsOf(platform.trace);
    platform.faults.clear();
    return run;
  }
};

bool isRelease(const std::optional<std::string>& fault) { return fault && fault->ends_with("SystemAlert.releaseAlert"); }

bool isNewGrant(const std::optional<RecordData>& before, const std::optional<RecordData>& after) {
  return after && after->granted && after != before;
}

TEST_P(InEverySituation, OneFailingCallEndsInOneAnswerAndNeverInAGrant) {
  inFreshProcess([] {
    FakePlatform& platform = freshPlatform();
    std::make_shared<PluginUnderTest>(platform.services())->_shouldIgnoreAccessRequest();
    const Run calm = run(platform, [](FaultInjector&) {});
    const bool isAccessRequest = calm.steps.front().find("handling request for access") != std::string::npos;

    std::size_t n = 1;
    for (;; ++n) {
      const Run failed = run(platform, [n](FaultInjector& faults) { faults.throwOnCall(n); });
      if (!failed.fault) break;
      SCOPED_TRACE(*failed.fault);
      if (failed.answeredBeforeTheFault || failed.storedBeforeTheFault || isRelease(failed.fault)) {
        EXPECT_THAT(failed.answer, FieldsAre(calm.answer.granted, calm.answer.error));
      } else {
        EXPECT_THAT(failed.answer, isUnexpectedFailureAnswer());
        EXPECT_FALSE(isAccessRequest && isNewGrant(failed.recordBefore, failed.recordAfter));
      }
    }
    EXPECT_GE(n, calm.steps.size()) << "Every step of the trace is a call that can fail.";
  });
}

TEST_P(InEverySituation, CallsThatAllFailFromSomeMomentOnEndInOneAnswerAndNeverInAGrant) {
  inFreshProcess([] {
    FakePlatform& platform = freshPlatform();
    std::make_shared<PluginUnderTest>(platform.services())->_shouldIgnoreAccessRequest();
    const Run calm = run(platform, [](FaultInjector&) {});
    for (std::size_t n = 1;; ++n) {
      const Run failed = run(platform, [n](FaultInjector& faults) { faults.throwFromCall(n); });
      if (!failed.fault) break;
      SCOPED_TRACE(*failed.fault);
      if (failed.answeredBeforeTheFault || failed.storedBeforeTheFault) {
        EXPECT_THAT(failed.answer, FieldsAre(calm.answer.granted, calm.answer.error));
      } else {
        EXPECT_THAT(failed.answer, isUnexpectedFailureAnswer());
      }
    }
  });
}

INSTANTIATE_TEST_SUITE_P(, InEverySituation, ::testing::ValuesIn(situations), nameOfCase<Situation>);

TEST(AnAlertThatCannotBeReleased, ChangesNoAnswer) {
  for (const bool userAllowed : {true, false}) {
    Scene scene;
    scene.addAccount();
    scene.platform.alert.answers = {userAllowed ? userAllows() : userRefuses()};
    scene.platform.social.authorizationAnswers = {serverGrants({"email"})};
    scene.platform.faults.throwOn("SystemAlert.releaseAlert");
    EXPECT_EQ(scene.requestAccess(optionsAskingFor({"email"})).granted, userAllowed);
    EXPECT_THAT(logLines(scene.platform.trace),
                Contains(::testing::Field(&LogLine::format, "The access decision failed unexpectedly: %@")));
  }
}

TEST(AnExceptionThatIsNoStandardException, IsARefusalLikeAnyOther) {
  Scene scene;
  scene.addAccount();
  scene.platform.alert.answers = {userAllows()};
  scene.platform.faults.throwOn("SystemAlert.receiveResponse");
  scene.platform.faults.raiseWith([](const std::string&) { throw 42; });
  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email"})),
              isRefusalWith(accountsError(99, "The access decision failed unexpectedly: an exception of an unknown type")));
}

TEST(AFailureWhileTheServersAnswerIsDealtWith, IsTheReasonThatTheDaemonIsTold) {
  const std::pair<const char*, Array> cases[] = {{"KeychainManager.setCredentialForAccount", {"email"}},
                                                 {"JsonParser.parse", {"future"}}};
  for (const auto& [call, permissions] : cases) {
    Scene scene;
    withTheUserAllowing(Delivery::onThread)(scene);
    scene.platform.faults.throwOn(call);
    const CompletionCall answer = scene.requestAccess(optionsAskingFor(permissions));
    ASSERT_THAT(answer, isUnexpectedFailureAnswer()) << call;
    EXPECT_THAT(answer.error->description, ::testing::Optional(::testing::EndsWith(call)));
  }
}

TEST(AFailure, IsLoggedWithTheOperationAndTheReason) {
  Scene scene;
  scene.addAccount();
  scene.addRecord(grantOfEmail);
  scene.platform.faults.throwOn("AuthorizationManager.setAuthorization");
  EXPECT_THAT(scene.revoke(), isUnexpectedFailureAnswer());
  EXPECT_THAT(logLines(scene.platform.trace),
              Contains(::testing::AllOf(
                  ::testing::Field(&LogLine::level, 3),
                  ::testing::Field(&LogLine::operation, "revokeAccessToAccountsOfType:forClient:store:completion:"),
                  ::testing::Field(&LogLine::format, "The access decision failed unexpectedly: %@"),
                  ::testing::Field(&LogLine::arguments,
                                   ::testing::ElementsAre(::testing::EndsWith("AuthorizationManager.setAuthorization"))),
                  ::testing::Field(&LogLine::argumentNames, "failure"))));
}

}  // namespace
}  // namespace palisade
