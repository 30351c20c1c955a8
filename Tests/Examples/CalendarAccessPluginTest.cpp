// The example plug-in, loaded as the daemon loads it: from its file, with the texts beside it.

#include <gmock/gmock.h>

#include <memory>
#include <optional>
#include <string>

#include "Host/Daemon/PluginLoader.h"
#include "Host/Json/Json.h"
#include "Host/Strings/GettextStringTable.h"
#include "Platform/AccountConstants.h"
#include "Platform/AccountType.h"
#include "Platform/ClientAuthorization.h"
#include "Testing/FakePlatform.h"

namespace palisade {
namespace {

using testing::AllOf;
using testing::ElementsAre;
using testing::Eq;
using testing::Field;
using testing::IsEmpty;
using testing::IsNull;
using testing::Ne;
using testing::NotNull;
using testing::SizeIs;

const std::string calendar = "org.example.accounttype.calendar";
const Error storeIsFull{.domain = "org.example.store", .code = 3, .description = "The disk is full."};

const LoadedPlugin& loaded() {
  static const LoadedPlugin plugin = loadPlugin(PALISADE_CALENDAR_MODULE);
  return plugin;
}

auto isGrant() { return AllOf(Field(&CompletionCall::granted, true), Field(&CompletionCall::error, Eq(std::nullopt))); }

auto isRefusal(AccountsErrorCode code) {
  return AllOf(Field(&CompletionCall::granted, false),
               Field(&CompletionCall::error, testing::Optional(AllOf(Field(&Error::domain, std::string(AccountsErrorDomain)),
                                                                     Field(&Error::code, code)))));
}

auto isRefusalWith(const Error& error) {
  return AllOf(Field(&CompletionCall::granted, false), Field(&CompletionCall::error, testing::Optional(error)));
}

/// A user with one calendar, an application, and the plug-in between them.
struct CalendarScene {
  explicit CalendarScene(FakeClientData application = {.id = "planner",
                                                       .bundleID = "org.example.planner",
                                                       .appName = "Planner"})
      : client(platform.makeClient(std::move(application))) {
    platform.store->addAccount({.id = "1", .type = calendar, .description = "my calendar"});
  }

  void request(bool allowUserInteraction = true) {
    platform.run([&] {
      plugin->handleAccessRequestToAccountsOfType(type, client, nullptr, platform.store, allowUserInteraction,
                                                  platform.completion());
    });
  }
  void authorize() {
    platform.run([&] { plugin->authorizeAccessToAccountsOfType(type, client, platform.store, platform.completion()); });
  }
  void revoke() {
    platform.run([&] { plugin->revokeAccessToAccountsOfType(type, client, platform.store, platform.completion()); });
  }
  void revokeAll() {
    platform.run([&] { plugin->revokeAllAccessToAccountsOfType(type, platform.store, platform.completion()); });
  }

  void remember(bool isGranted) {
    ClientAuthorization record(client);
    record.setIsGranted(isGranted);
    platform.authorizations.addRecord(record, calendar);
  }

  /// What the store holds of the application: granted, refused, or nothing.
  std::optional<bool> remembered() const {
    const auto record = platform.authorizations.recordOf(*client, calendar);
    return record == nullptr ? std::nullopt : std::optional(record->isGranted());
  }

  std::vector<Event> alerts() const { return platform.trace.named("SystemAlert.createAlert"); }

  FakePlatform& platform =
      FakePlatform::create(std::make_shared<NlohmannJsonParser>(),
                           std::make_shared<GettextStringTable>(loaded().path.parent_path() / "Resources", "en"));
  std::shared_ptr<const AccountType> type = std::make_shared<const AccountType>(calendar);
  std::shared_ptr<const Client> client;
  std::shared_ptr<AccountAccessPlugin> plugin = loaded().module->create(platform.services());
};

TEST(TheCalendarModule, ServesCalendarsAndNothingElse) {
  EXPECT_TRUE(loaded().module->supportsAccountTypeWithIdentifier(calendar));
  EXPECT_FALSE(loaded().module->supportsAccountTypeWithIdentifier(AccountTypeIdentifierFacebook));
  EXPECT_FALSE(loaded().module->supportsAccountTypeWithIdentifier(""));
}

TEST(TheCalendarModule, MakesNoPluginWithoutAllServices) {
  PlatformServices services = CalendarScene().platform.services();
  EXPECT_THAT(loaded().module->create(services), NotNull());
  services.alert = nullptr;
  EXPECT_THAT(loaded().module->create(services), IsNull());
}

TEST(ACalendarRequest, SaysWhoAsksForWhat) {
  CalendarScene scene;
  scene.request();
  ASSERT_THAT(scene.alerts(), SizeIs(1));
  const Dictionary expected{{"header", "Allow Access to Your Calendar?"},
                            {"message", "“Planner” would like to see and change the events in your calendar."},
                            {"alternateButtonTitle", "Don’t Allow"},
                            {"defaultButtonTitle", "Allow"},
                            {"topMost", true},
                            {"dismissOnLock", true},
                            {"doNotDismissOnUnlock", true}};
  EXPECT_EQ(scene.alerts().front()["description"], Value(expected));
}

TEST(ACalendarRequest, IsGrantedWhenTheUserAllowsItAndNotAskedAgain) {
  CalendarScene scene;
  scene.platform.alert.answers = {userAllows()};
  scene.request();
  scene.request();
  EXPECT_THAT(scene.platform.completions(), ElementsAre(isGrant(), isGrant()));
  EXPECT_THAT(scene.alerts(), SizeIs(1));
  EXPECT_EQ(scene.remembered(), true);
}

TEST(ACalendarRequest, IsRefusedWhenTheUserRefusesItAndNotAskedAgain) {
  CalendarScene scene;
  scene.platform.alert.answers = {userRefuses(), userAllows()};
  scene.request();
  scene.request();
  EXPECT_THAT(scene.platform.completions(),
              ElementsAre(isRefusal(AccountsErrorAccessDenied), isRefusal(AccountsErrorAccessDenied)));
  EXPECT_THAT(scene.alerts(), SizeIs(1));
  EXPECT_EQ(scene.remembered(), false);
}

TEST(ACalendarRequest, IsRefusedAndAskedAgainWhenNobodyAnswered) {
  CalendarScene scene;
  scene.platform.alert.answers = {alertCannotBeCreated(), {.word = AlertResponseNobody}, userAllows()};
  scene.request();
  scene.request();
  EXPECT_EQ(scene.remembered(), std::nullopt);
  scene.request();
  EXPECT_THAT(scene.platform.completions(),
              ElementsAre(isRefusal(AccountsErrorAccessDenied), isRefusal(AccountsErrorAccessDenied), isGrant()));
}

TEST(ACalendarRequest, TakesItsAlertDownAfterTheAnswer) {
  CalendarScene scene;
  scene.platform.alert.whileShown = [&] { EXPECT_EQ(scene.platform.alert.standingAlerts(), 1u); };
  scene.request();
  EXPECT_EQ(scene.platform.alert.standingAlerts(), 0u);
}

TEST(ACalendarRequest, IsRefusedWithoutAQuestionWhereTheUserMayNotBeAsked) {
  CalendarScene scene;
  scene.platform.alert.answers = {userAllows()};
  scene.request(false);
  EXPECT_THAT(scene.platform.completions(), ElementsAre(isRefusal(AccountsErrorAccessDenied)));
  EXPECT_THAT(scene.alerts(), IsEmpty());
  EXPECT_EQ(scene.remembered(), std::nullopt);
}

TEST(ACalendarRequest, IsGrantedWithoutAQuestionToWhoeverMayUseAllAccounts) {
  CalendarScene scene({.id = "system", .entitlements = {std::string(AllAccountsAccessEntitlement)}});
  scene.request();
  EXPECT_THAT(scene.platform.completions(), ElementsAre(isGrant()));
  EXPECT_THAT(scene.alerts(), IsEmpty());
}

TEST(ACalendarRequest, SaysThatThereIsNoCalendar) {
  CalendarScene scene;
  scene.type = std::make_shared<const AccountType>("org.example.accounttype.other");
  scene.request();
  EXPECT_THAT(scene.platform.completions(), ElementsAre(isRefusal(AccountsErrorAccountNotFound)));
  EXPECT_THAT(scene.alerts(), IsEmpty());
}

TEST(ACalendarRequest, IsNotGrantedWhenTheAnswerCannotBeKept) {
  CalendarScene scene;
  scene.platform.alert.answers = {userAllows()};
  scene.platform.authorizations.answerWrites({storeIsFull});
  scene.request();
  EXPECT_THAT(scene.platform.completions(), ElementsAre(isRefusalWith(storeIsFull)));
}

TEST(ACalendarRequest, IsWrittenToTheAccessLogWithTheUsersAnswer) {
  CalendarScene scene;
  scene.platform.alert.answers = {userAllows()};
  scene.request();
  const auto records = scene.platform.trace.named("logAccessRequest");
  ASSERT_THAT(records, SizeIs(1));
  EXPECT_EQ(records.front()["accountType"], Value(calendar)) << records.front();
  EXPECT_EQ(records.front()["bundleID"], Value("org.example.planner")) << records.front();
  EXPECT_EQ(records.front()["granted"], Value(true)) << records.front();
  EXPECT_EQ(records.front()["userPrompted"], Value(true)) << records.front();
}

TEST(ACalendarAuthorization, GrantsWithoutAQuestionEvenAfterARefusal) {
  CalendarScene scene;
  scene.remember(false);
  scene.authorize();
  EXPECT_THAT(scene.platform.completions(), ElementsAre(isGrant()));
  EXPECT_EQ(scene.remembered(), true);
  EXPECT_THAT(scene.alerts(), IsEmpty());
}

TEST(ACalendarAuthorization, FailsWithoutACalendarOrAStoreThatKeepsIt) {
  CalendarScene scene;
  scene.platform.authorizations.answerWrites({storeIsFull});
  scene.authorize();
  scene.type = std::make_shared<const AccountType>("org.example.accounttype.other");
  scene.authorize();
  EXPECT_THAT(scene.platform.completions(), ElementsAre(isRefusalWith(storeIsFull), isRefusal(AccountsErrorAccountNotFound)));
}

TEST(ACalendarRevocation, RefusesTheApplicationFromThenOn) {
  CalendarScene scene;
  scene.remember(true);
  scene.revoke();
  scene.request();
  EXPECT_THAT(scene.platform.completions(), ElementsAre(isGrant(), isRefusal(AccountsErrorAccessDenied)));
  EXPECT_THAT(scene.alerts(), IsEmpty());
}

TEST(ACalendarRevocation, LeavesAnApplicationThatNeverAskedFreeToAsk) {
  CalendarScene scene;
  scene.revoke();
  EXPECT_THAT(scene.platform.completions(), ElementsAre(isGrant()));
  EXPECT_EQ(scene.remembered(), std::nullopt);
}

TEST(ACalendarRevocation, SaysWhenTheStoreKeepsTheGrant) {
  CalendarScene scene;
  scene.remember(true);
  scene.platform.authorizations.answerWrites({storeIsFull});
  scene.revoke();
  EXPECT_THAT(scene.platform.completions(), ElementsAre(isRefusalWith(storeIsFull)));
}

TEST(ARevocationOfAllCalendarGrants, LetsEveryApplicationAskAnew) {
  CalendarScene scene;
  scene.remember(true);
  scene.platform.alert.answers = {userRefuses()};
  scene.revokeAll();
  scene.request();
  EXPECT_THAT(scene.platform.completions(), ElementsAre(isGrant(), isRefusal(AccountsErrorAccessDenied)));
  EXPECT_THAT(scene.alerts(), SizeIs(1));
}

TEST(ARevocationOfAllCalendarGrants, SaysWhenTheStoreKeepsThem) {
  CalendarScene scene;
  scene.platform.authorizations.answerRemovals(storeIsFull);
  scene.revokeAll();
  EXPECT_THAT(scene.platform.completions(), ElementsAre(isRefusalWith(storeIsFull)));
}

// Whatever service fails at whatever moment: one answer, a refusal, and no alert left on the screen.
void expectRefusalWhateverFails(void (*operation)(CalendarScene&)) {
  for (std::size_t n = 1;; ++n) {
    CalendarScene scene;
    scene.platform.alert.answers = {userAllows()};
    scene.platform.faults.throwOnCall(n);
    operation(scene);
    const auto fault = scene.platform.faults.firstFault();
    if (!fault) {
      EXPECT_GT(n, 1u);
      break;
    }
    EXPECT_THAT(scene.platform.completions(), ElementsAre(isRefusal(AccountsErrorUnexpectedFailure))) << *fault;
    const std::size_t alertsThatCannotBeTakenDown = *fault == "SystemAlert.releaseAlert" ? 1 : 0;
    EXPECT_EQ(scene.platform.alert.standingAlerts(), alertsThatCannotBeTakenDown) << *fault;
  }
}

TEST(TheCalendarPlugin, RefusesWhateverServiceFails) {
  expectRefusalWhateverFails([](CalendarScene& scene) { scene.request(); });
  expectRefusalWhateverFails([](CalendarScene& scene) { scene.authorize(); });
  expectRefusalWhateverFails([](CalendarScene& scene) {
    scene.remember(true);
    scene.revoke();
  });
  expectRefusalWhateverFails([](CalendarScene& scene) { scene.revokeAll(); });
}

TEST(TheCalendarPlugin, RefusesWhenAServiceThrowsNoException) {
  CalendarScene scene;
  scene.platform.faults.raiseWith([](const std::string&) { throw 7; });
  scene.platform.faults.throwOn("SystemAlert.receiveResponse");
  scene.request();
  EXPECT_THAT(scene.platform.completions(), ElementsAre(isRefusal(AccountsErrorUnexpectedFailure)));
}

}  // namespace
}  // namespace palisade
