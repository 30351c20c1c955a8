#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <memory>
#include <ostream>

#include "Host/Json/Json.h"
#include "Platform/AccountConstants.h"
#include "Platform/AccountType.h"
#include "Testing/FakePlatform.h"
#include "Testing/TraceValue.h"

namespace palisade {
namespace {

using ::testing::ElementsAre;
using ::testing::Eq;
using ::testing::Field;
using ::testing::IsEmpty;
using ::testing::IsNull;
using ::testing::NotNull;
using ::testing::Optional;
using ::testing::Pointee;
using ::testing::Property;
using ::testing::SizeIs;

const std::string facebookIdentifier(AccountTypeIdentifierFacebook);
const AccountType facebook{facebookIdentifier};
const Error refusal{.domain = "org.example", .code = 5};

class TheScriptedPlatform : public ::testing::Test {
 protected:
  ClientAuthorization grantOf(PermissionSet permissions) const {
    ClientAuthorization record(client);
    record.setIsGranted(true);
    record.setOptions(std::make_shared<const Dictionary>(Dictionary{{"key", "value"}}));
    record.setGrantedPermissions(std::make_shared<const PermissionSet>(std::move(permissions)));
    return record;
  }

  std::shared_ptr<Account> firstAccount() {
    return platform.store->accountsWithAccountTypeIdentifier(facebookIdentifier).at(0);
  }

  FakePlatform& platform = FakePlatform::create(std::make_shared<NlohmannJsonParser>());
  const std::shared_ptr<const FakeClient> client = platform.makeClient({.id = "photos", .description = "Photos"});
};

TEST_F(TheScriptedPlatform, HandsOutRecordsThatChangeNothingInTheStore) {
  platform.authorizations.addRecord(grantOf({"email"}), facebookIdentifier);
  const auto copy = platform.authorizations.authorizationForClient(client, facebook);
  copy->setIsGranted(false);
  copy->setGrantedPermissions(nullptr);
  const auto listed = platform.authorizations.allAuthorizationsForAccountType(facebook).at(0);
  listed->setIsGranted(false);

  const auto stored = platform.authorizations.recordOf(*client, facebookIdentifier);
  EXPECT_TRUE(stored->isGranted());
  EXPECT_THAT(stored->grantedPermissions(), Pointee(ElementsAre("email")));
}

TEST_F(TheScriptedPlatform, SharesNothingWithTheRecordThatItStores) {
  ClientAuthorization record = grantOf({"email"});
  EXPECT_THAT(platform.authorizations.setAuthorization(record, client, facebook), Eq(std::nullopt));
  record.setIsGranted(false);
  const auto stored = platform.authorizations.recordOf(*client, facebookIdentifier);
  EXPECT_TRUE(stored->isGranted());
  EXPECT_NE(stored->options(), record.options());
  EXPECT_EQ(*stored->options(), *record.options());
}

TEST_F(TheScriptedPlatform, KeepsOneRecordAClientInItsPlace) {
  const auto other = platform.makeClient({.id = "games"});
  platform.authorizations.addRecord(grantOf({"email"}), facebookIdentifier);
  platform.authorizations.addRecord(ClientAuthorization(other), facebookIdentifier);
  platform.authorizations.setAuthorization(grantOf({"friends"}), client, facebook);
  EXPECT_THAT(platform.authorizations.allAuthorizationsForAccountType(facebook),
              ElementsAre(Pointee(Property(&ClientAuthorization::client, Eq(client))),
                          Pointee(Property(&ClientAuthorization::client, Eq(other)))));
}

TEST_F(TheScriptedPlatform, RefusesTheRecordThatItIsToldToRefuse) {
  platform.authorizations.answerWrites({std::nullopt, refusal});
  EXPECT_THAT(platform.authorizations.setAuthorization(grantOf({"a"}), client, facebook), Eq(std::nullopt));
  EXPECT_THAT(platform.authorizations.setAuthorization(grantOf({"b"}), client, facebook), Optional(refusal));
  EXPECT_THAT(platform.authorizations.recordOf(*client, facebookIdentifier)->grantedPermissions(), Pointee(ElementsAre("a")));
  EXPECT_THAT(platform.authorizations.setAuthorization(grantOf({"c"}), client, facebook), Eq(std::nullopt));
}

TEST_F(TheScriptedPlatform, RemovesTheRecordsOfOneAccountTypeUnlessItIsToldToRefuse) {
  platform.authorizations.addRecord(grantOf({"a"}), facebookIdentifier);
  platform.authorizations.addRecord(grantOf({"a"}), "another type");
  platform.authorizations.answerRemovals(refusal);
  EXPECT_THAT(platform.authorizations.removeAllClientAuthorizationsForAccountType(facebook), Optional(refusal));
  EXPECT_THAT(platform.authorizations.recordOf(*client, facebookIdentifier), NotNull());
  platform.authorizations.answerRemovals(std::nullopt);
  EXPECT_THAT(platform.authorizations.removeAllClientAuthorizationsForAccountType(facebook), Eq(std::nullopt));
  EXPECT_THAT(platform.authorizations.recordOf(*client, facebookIdentifier), IsNull());
  EXPECT_THAT(platform.authorizations.recordOf(*client, "another type"), NotNull());
}

TEST_F(TheScriptedPlatform, MakesAFreshAccountForEveryLookUp) {
  platform.store->addAccount({.id = "1", .type = facebookIdentifier});
  const auto first = firstAccount();
  first->setCredential(std::make_shared<const AccountCredential>("token", "", distantFuture));
  EXPECT_THAT(firstAccount()->credential(), IsNull());
}

TEST_F(TheScriptedPlatform, FindsTheAccountsOfOneTypeInOrder) {
  platform.store->addAccount({.id = "1", .type = facebookIdentifier, .description = "first"});
  platform.store->addAccount({.id = "2", .type = "another type"});
  platform.store->addAccount({.id = "3", .type = facebookIdentifier, .description = "third"});
  EXPECT_THAT(
      platform.store->accountsWithAccountTypeIdentifier(facebookIdentifier),
      ElementsAre(Pointee(Property(&Account::description, "first")), Pointee(Property(&Account::description, "third"))));
}

TEST_F(TheScriptedPlatform, WritesAnAccountsCredentialIntoTheKeychainUnlessItIsToldToRefuse) {
  platform.store->addAccount({.id = "1", .type = facebookIdentifier});
  platform.keychain.addCredential("1", "org.example.photos", "old");
  const auto account = firstAccount();
  account->setCredential(std::make_shared<const AccountCredential>("new", "", distantFuture));

  platform.keychain.refuseWrites(refusal);
  EXPECT_THAT(platform.keychain.setCredentialForAccount(account, "org.example.photos"), Optional(refusal));
  EXPECT_THAT(platform.keychain.entry("1", "org.example.photos")->oauthToken(), Optional(Eq("old")));

  platform.keychain.refuseWrites(std::nullopt);
  EXPECT_THAT(platform.keychain.setCredentialForAccount(account, "org.example.photos"), Eq(std::nullopt));
  EXPECT_THAT(platform.keychain.entry("1", "org.example.photos")->oauthToken(), Optional(Eq("new")));
}

TEST_F(TheScriptedPlatform, RemovesAKeychainEntryUnlessItIsToldToRefuse) {
  platform.store->addAccount({.id = "1", .type = facebookIdentifier});
  platform.keychain.addCredential("1", "b", "token");
  platform.keychain.refuseRemovals(refusal);
  EXPECT_THAT(platform.keychain.removeCredentialForAccount(firstAccount(), "b"), Optional(refusal));
  EXPECT_THAT(platform.keychain.entry("1", "b"), NotNull());
  platform.keychain.refuseRemovals(std::nullopt);
  EXPECT_THAT(platform.keychain.removeCredentialForAccount(firstAccount(), "b"), Eq(std::nullopt));
  EXPECT_THAT(platform.keychain.entry("1", "b"), IsNull());
}

struct AlertCase {
  const char* name;
  AlertAnswer answer;
  bool hasHandle;
  int status;
  AlertResponse word;
};

void PrintTo(const AlertCase& row, std::ostream* stream) { *stream << row.name; }

class AnAlert : public ::testing::TestWithParam<AlertCase> {};

TEST_P(AnAlert, AnswersAsScripted) {
  FakePlatform& platform = FakePlatform::create(std::make_shared<NlohmannJsonParser>());
  platform.alert.answers = {GetParam().answer};
  AlertResponse word = 77;
  const auto handle = platform.alert.createAlert(AlertAllocator::defaultAllocator, 0, AlertFlagsPlain, nullptr, {});
  EXPECT_EQ(handle != nullptr, GetParam().hasHandle);
  EXPECT_EQ(platform.alert.receiveResponse(handle, 0, word), GetParam().status);
  EXPECT_EQ(word, GetParam().word);
  platform.alert.releaseAlert(handle);
  EXPECT_EQ(platform.alert.standingAlerts(), 0u);
}

INSTANTIATE_TEST_SUITE_P(Script, AnAlert,
                         ::testing::Values(AlertCase{"AllowedByTheUser", userAllows(), true, 0, 0},
                                           AlertCase{"RefusedByTheUser", userRefuses(), true, 0, 1},
                                           AlertCase{"LeavesTheWordAlone", AlertAnswer{}, true, 0, 77},
                                           AlertCase{"ThatCannotBeCreated", alertCannotBeCreated(), false, 0, 77},
                                           AlertCase{"WithoutAHandleStillFollowsTheScript",
                                                     AlertAnswer{.handle = false, .status = 5, .word = AlertResponse{9}}, false,
                                                     5, 9}),
                         [](const ::testing::TestParamInfo<AlertCase>& row) { return row.param.name; });

TEST_F(TheScriptedPlatform, RepeatsTheLastAnswerOfAScript) {
  platform.alert.answers = {userRefuses(), userAllows()};
  std::vector<AlertResponse> words;
  for (int alert = 0; alert < 3; ++alert) {
    AlertResponse word = AlertResponseNobody;
    platform.alert.receiveResponse(platform.alert.createAlert(AlertAllocator::defaultAllocator, 0, 0, nullptr, {}), 0, word);
    words.push_back(word);
  }
  EXPECT_THAT(words, ElementsAre(1, 0, 0));
}

TEST_F(TheScriptedPlatform, RunsTheWorkOfAQueueInOrderOnThatQueue) {
  const auto queue = platform.queues.makeSerialQueue("org.example.queue");
  queue->async([this] { platform.preferences.synchronize("first"); });
  queue->sync([this] { platform.preferences.synchronize("second"); });
  const auto events = platform.trace.named("Preferences.synchronize");
  ASSERT_THAT(events, SizeIs(2));
  EXPECT_EQ(events[0]["domain"], Value("first"));
  EXPECT_EQ(events[1]["domain"], Value("second"));
  EXPECT_EQ(events[1]["queue"], Value("org.example.queue"));
  EXPECT_EQ(events[1].thread, "preferences");
}

TEST_F(TheScriptedPlatform, DeliversANotificationToItsQueueUntilTheRegistrationIsGiven) {
  const auto queue = platform.queues.makeSerialQueue("q");
  auto registration =
      platform.notifications.registerHandler("changed", queue, [this] { platform.preferences.synchronize("d"); });
  platform.notifications.post("changed");
  platform.notifications.post("something else");
  platform.queues.drain();
  EXPECT_THAT(platform.trace.named("Preferences.synchronize"), SizeIs(1));
  registration.reset();
  platform.notifications.post("changed");
  platform.queues.drain();
  EXPECT_THAT(platform.trace.named("Preferences.synchronize"), SizeIs(1));
}

TEST_F(TheScriptedPlatform, LaysTextsOverTheTableBelow) {
  platform.strings.set("K", "text");
  const auto below = std::shared_ptr<const StringTable>(std::shared_ptr<void>(), &platform.strings);
  FakePlatform& above = FakePlatform::create(std::make_shared<NlohmannJsonParser>(), below);
  EXPECT_EQ(above.strings.localizedString("K", "default", "Localizable"), "text");
  above.strings.set("K", std::nullopt);
  EXPECT_EQ(above.strings.localizedString("K", "default", "Localizable"), "default");
  EXPECT_EQ(platform.strings.localizedString("missing", "default", "Localizable"), "default");
  EXPECT_THAT(above.strings.lookups(), SizeIs(2));
}

TEST_F(TheScriptedPlatform, DropsLogRecordsAboveTheEnabledLevel) {
  platform.log.enableUpTo(LogLevel::notice);
  platform.log.record("name", LogLevel::debug, "%@", "client", client);
  platform.log.record("name", LogLevel::notice, "%@", "client", client);
  ASSERT_THAT(platform.trace.named("log"), SizeIs(1));
  EXPECT_EQ(platform.trace.named("log")[0]["rendered"], Value("Photos"));
}

TEST_F(TheScriptedPlatform, TellsNoneFromANullInATrace) {
  EXPECT_EQ(traceDictionary(nullptr), Value());
  EXPECT_EQ(traceValue(Dictionary{{"key", nullptr}}), Value(Dictionary{{"key", Dictionary{{"$null", true}}}}));
  EXPECT_EQ(traceSet(nullptr), Value());
  EXPECT_EQ(traceSet(std::make_shared<const PermissionSet>(PermissionSet{"b", "a"})),
            Value(Dictionary{{"$set", Array{"a", "b"}}}));
}

}  // namespace
}  // namespace palisade
