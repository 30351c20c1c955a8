// The consent prompt: what the alert says, what its answer means, and when its handle is given up.

#include <string>
#include <thread>
#include <vector>

#include <gmock/gmock.h>

#include "Tests/Unit/Support/Scene.h"

namespace palisade {
namespace {

using ::testing::Contains;
using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::Field;
using ::testing::FieldsAre;
using ::testing::IsEmpty;
using ::testing::Not;
using ::testing::StartsWith;

struct PromptAnswer {
  bool granted;
  bool skipServer;
  PermissionSetRef permissions;
};

class ThePrompt : public ::testing::Test {
 protected:
  ThePrompt() {
    _platform.strings.set("ACCOUNT_ACCESS_REQUEST_TITLE", "Access %@");
    _platform.strings.set("ACCOUNT_ACCESS_ALLOW_BUTTON_TITLE", "Allow");
    _platform.strings.set("ACCOUNT_ACCESS_DO_NOT_ALLOW_BUTTON_TITLE", "Don't Allow");
    _platform.strings.set("ACCOUNT_ACCESS_BASIC_MESSAGE", "“%@” asks.");
  }

  std::vector<PromptAnswer> askFor(const PermissionSetRef& permissions) {
    std::vector<PromptAnswer> answers;
    _platform.run([&] {
      _scene.plugin->_promptUserToApproveRequestForPermissions(
          permissions, std::string(FacebookAudienceOnlyMe), _scene.client, _scene.makeAccount(),
          [&](bool granted, bool skipServer, const PermissionSetRef& asked) {
            _platform.trace.record("prompt completion");
            answers.push_back({granted, skipServer, asked});
          });
    });
    return answers;
  }

  std::vector<bool> show(const std::string& message) {
    std::vector<bool> answers;
    _scene.plugin->_showAlertWithMessage(message, [&](bool granted) { answers.push_back(granted); });
    return answers;
  }

  Dictionary shownDescription() const {
    const auto alerts = _platform.trace.named("SystemAlert.createAlert");
    return alerts.empty() ? Dictionary() : *alerts.back()["description"].dictionary();
  }

  Scene _scene;
  FakePlatform& _platform = _scene.platform;
};

TEST_F(ThePrompt, HandsTheVerySetThatItWasGivenToItsCompletionOnBothAnswers) {
  const PermissionSetRef permissions = permissionSet({"email", "publish"});
  for (const bool userAllowed : {true, false}) {
    _platform.alert.answers = {userAllowed ? userAllows() : userRefuses()};
    EXPECT_THAT(askFor(permissions), ElementsAre(FieldsAre(userAllowed, false, permissions)));
  }
}

TEST_F(ThePrompt, AsksForNothingInASentenceToo) {
  _platform.alert.answers = {userAllows()};
  const PermissionSetRef nothing = permissionSet({});
  EXPECT_THAT(askFor(nothing), ElementsAre(FieldsAre(true, false, nothing)));
  EXPECT_EQ(*shownDescription().find("message"), Value("“Photos” asks."));
}

TEST_F(ThePrompt, RefusesWithoutAnAlertWhenThereIsNoMessage) {
  _platform.alert.answers = {userAllows()};
  _platform.social.descriptionAnswers = {serverCannotBeReached()};

  EXPECT_THAT(askFor(permissionSet({"future", "email"})), ElementsAre(FieldsAre(false, false, nullptr)));

  EXPECT_THAT(_platform.trace.names(), Each(Not(StartsWith("SystemAlert."))));
  const std::vector<LogLine> lines = logLines(_platform.trace);
  EXPECT_EQ(lines.back(), (LogLine{3, "_promptUserToApproveRequestForPermissions:withAudience:fromClient:account:completion:",
                                   "Something really bad happened and we ended up with an invalid message"}));
  EXPECT_THAT(lines, Contains(Field(&LogLine::format, StartsWith("Something really bad"))).Times(1));
}

TEST_F(ThePrompt, ShowsAnEmptyMessageLikeAnyOther) {
  _platform.strings.set("ACCOUNT_ACCESS_BASIC_MESSAGE", "");
  _platform.alert.answers = {userAllows()};
  EXPECT_THAT(askFor(permissionSet({})), ElementsAre(FieldsAre(true, false, Not(nullptr))));
  EXPECT_EQ(*shownDescription().find("message"), Value(""));
}

TEST_F(ThePrompt, ComposesForThePermissionsTheAudienceAndTheAppNameOfTheRequest) {
  _platform.strings.set("ACCOUNT_ACCESS_ONE_PERMISSION_FORMAT", "%@: %@");
  _platform.strings.set("ACCCOUNT_ACCESS_WRITE", "post to %@");
  _platform.strings.set("POST_TO_FRIENDS", "friends");
  _platform.strings.set("POST_PRIVATELY", "nobody");
  _platform.strings.set("POST_PUBLICALLY", "everyone");
  const std::pair<std::string_view, const char*> cases[] = {{FacebookAudienceFriends, "Photos: post to friends"},
                                                            {FacebookAudienceOnlyMe, "Photos: post to nobody"},
                                                            {FacebookAudienceEveryone, "Photos: post to everyone"}};
  for (const auto& [audience, message] : cases) {
    _scene.plugin->_promptUserToApproveRequestForPermissions(permissionSet({"publish"}), std::string(audience), _scene.client,
                                                             _scene.makeAccount(), [](bool, bool, const PermissionSetRef&) {});
    EXPECT_EQ(*shownDescription().find("message"), Value(message));
  }
}

TEST_F(ThePrompt, HasUnknownPermissionsDescribedForTheAudienceAndTheAccountOfTheRequest) {
  _platform.social.descriptionAnswers = {{.data = R"("see the future")"}};
  _platform.alert.answers = {userAllows()};
  askFor(permissionSet({"future"}));
  EXPECT_THAT(_platform.trace.named("FacebookPermissionDescriptionRequest.init"),
              ElementsAre(Field(&Event::members, Dictionary{{"permissions", tracedSet({"future"})}, {"audience", "SELF"}})));
  EXPECT_THAT(_platform.trace.named("FacebookPermissionDescriptionRequest.setAccessToken"),
              ElementsAre(Field(&Event::members, Dictionary{{"token", "master token of me"}})));
}

TEST_F(ThePrompt, ShowsTheTextsOfTheTableInTheirPlaces) {
  show("Photos asks %@.");
  EXPECT_EQ(shownDescription(), (Dictionary{{"header", "Access %@"},
                                            {"message", "Photos asks %@."},
                                            {"alternateButtonTitle", "Don't Allow"},
                                            {"defaultButtonTitle", "Allow"},
                                            {"topMost", true},
                                            {"dismissOnLock", true},
                                            {"doNotDismissOnUnlock", true}}));
}

TEST_F(ThePrompt, LooksItsTextsUpAfreshForEveryAlert) {
  using Lookup = FakeStringTable::Lookup;
  show("");
  _platform.strings.set("ACCOUNT_ACCESS_ALLOW_BUTTON_TITLE", "Zulassen");
  _platform.strings.set("ACCOUNT_ACCESS_REQUEST_TITLE", std::nullopt);
  show("");

  const Lookup title{"ACCOUNT_ACCESS_REQUEST_TITLE", "", "Localizable"};
  const Lookup allow{"ACCOUNT_ACCESS_ALLOW_BUTTON_TITLE", "", "Localizable"};
  const Lookup doNotAllow{"ACCOUNT_ACCESS_DO_NOT_ALLOW_BUTTON_TITLE", "", "Localizable"};
  EXPECT_THAT(_platform.strings.lookups(), ElementsAre(title, allow, doNotAllow, title, allow, doNotAllow));
  EXPECT_EQ(*shownDescription().find("defaultButtonTitle"), Value("Zulassen"));
  EXPECT_EQ(*shownDescription().find("header"), Value(""));
}

TEST_F(ThePrompt, WaitsForEverForAPlainAlert) {
  show("");
  const Event created = _platform.trace.named("SystemAlert.createAlert").at(0);
  EXPECT_EQ(created["allocator"], Value("default"));
  EXPECT_EQ(created["timeout"], Value(0.0));
  EXPECT_EQ(created["flags"], Value(0));
  EXPECT_EQ(created["errorPlace"], Value());
  EXPECT_EQ(_platform.trace.named("SystemAlert.receiveResponse").at(0).members,
            (Dictionary{{"handle", "alert"}, {"timeout", 0.0}}));
}

TEST_F(ThePrompt, KeepsItsCallerWaitingWhileTheUserDoesNotAnswer) {
  Scene& scene = *new Scene;  // The operation never returns; what it uses stays.
  scene.addAccount();
  scene.platform.alert.answers = {userNeverAnswers()};
  const auto options = std::make_shared<const Dictionary>(optionsAskingFor({"email"}));
  const OperationEnd end = scene.platform.run([&scene, options] {
    scene.plugin->handleAccessRequestToAccountsOfType(scene.facebook, scene.client, options, scene.store, true,
                                                      scene.platform.completion());
  });
  EXPECT_EQ(end, OperationEnd::waitsForAlert);
  EXPECT_THAT(scene.platform.completions(), IsEmpty());
}

TEST_F(ThePrompt, TakesTheWordZeroForConsentAndNoOtherWord) {
  const AlertResponse denials[] = {
      1, 2, 3, 4, 0x100, 0x10000, AlertResponse{1} << 31, AlertResponse{1} << 32, AlertResponse{1} << 63, AlertResponseNobody,
  };
  for (const AlertResponse word : denials) {
    _platform.alert.answers = {{.word = word}};
    EXPECT_THAT(show(""), ElementsAre(false)) << word;
  }
  _platform.alert.answers = {{.word = AlertResponse{0}}};
  EXPECT_THAT(show(""), ElementsAre(true));
}

TEST_F(ThePrompt, RefusesWhenNobodyWroteAWord) {
  for (const bool handle : {true, false}) {
    for (const int status : {0, 5}) {
      _platform.alert.answers = {{.handle = handle, .status = status}};
      EXPECT_THAT(show(""), ElementsAre(false)) << handle << status;
    }
  }
}

TEST_F(ThePrompt, ReadsTheWordAsItStandsWhateverTheStatus) {
  _platform.alert.answers = {{.status = 5, .word = AlertResponse{0}}, {.status = 5, .word = AlertResponse{1}}};
  EXPECT_THAT(show(""), ElementsAre(true));
  EXPECT_THAT(show(""), ElementsAre(false));
}

struct RawAnswer {
  bool hasHandle;
  AlertResponse word;
  std::size_t standing;
  std::thread::id thread;
};

TEST_F(ThePrompt, ReleasesTheAlertAfterTheCompletionHasReturned) {
  std::vector<RawAnswer> answers;
  _platform.alert.answers = {{.word = AlertResponse{42}}};

  _scene.plugin->_showUserNotificationWithTitle(
      "t", "m", "d", "a", [&](const std::shared_ptr<AlertHandle>& handle, AlertResponse word) {
        answers.push_back({handle != nullptr, word, _platform.alert.standingAlerts(), std::this_thread::get_id()});
        _platform.trace.record("alert completion");
      });

  EXPECT_THAT(answers, ElementsAre(FieldsAre(true, 42U, 1U, std::this_thread::get_id())));
  EXPECT_THAT(_platform.trace.names(), ElementsAre("SystemAlert.createAlert", "SystemAlert.receiveResponse", "alert completion",
                                                   "SystemAlert.releaseAlert"));
  EXPECT_EQ(_platform.alert.standingAlerts(), 0U);
}

TEST_F(ThePrompt, AsksForTheAnswerOfAnAlertThatCouldNotBeCreatedAndReleasesNothing) {
  std::vector<RawAnswer> answers;
  _platform.alert.answers = {{.handle = false, .word = AlertResponse{3}}};

  _scene.plugin->_showUserNotificationWithTitle("t", "m", "d", "a",
                                                [&](const std::shared_ptr<AlertHandle>& handle, AlertResponse word) {
                                                  answers.push_back({handle != nullptr, word, 0, {}});
                                                });

  EXPECT_THAT(answers, ElementsAre(FieldsAre(false, 3U, 0U, std::thread::id())));
  EXPECT_THAT(_platform.trace.names(), ElementsAre("SystemAlert.createAlert", "SystemAlert.receiveResponse"));
  EXPECT_EQ(_platform.trace.named("SystemAlert.receiveResponse").at(0)["handle"], Value());
}

TEST_F(ThePrompt, ReleasesTheAlertAlsoWhenItsAnswerCannotBeReceivedOrUsed) {
  _platform.faults.throwOn("SystemAlert.receiveResponse");
  EXPECT_THROW(show(""), InjectedFault);
  EXPECT_EQ(_platform.alert.standingAlerts(), 0U);

  EXPECT_THROW(_scene.plugin->_showAlertWithMessage("", [](bool) { throw std::runtime_error("no use"); }), std::runtime_error);
  EXPECT_EQ(_platform.alert.standingAlerts(), 0U);
}

TEST_F(ThePrompt, HandsTitleAndButtonsOverInTheirOrder) {
  _scene.plugin->_showUserNotificationWithTitle("title", "message", "default", "alternate",
                                                [](const std::shared_ptr<AlertHandle>&, AlertResponse) {});
  EXPECT_EQ(*shownDescription().find("header"), Value("title"));
  EXPECT_EQ(*shownDescription().find("message"), Value("message"));
  EXPECT_EQ(*shownDescription().find("defaultButtonTitle"), Value("default"));
  EXPECT_EQ(*shownDescription().find("alternateButtonTitle"), Value("alternate"));
}

}  // namespace
}  // namespace palisade
