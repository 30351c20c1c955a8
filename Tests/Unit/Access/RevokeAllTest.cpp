// Taking back every client's grant.

#include <string>
#include <vector>

#include <gmock/gmock.h>

#include "Tests/Unit/Support/Scene.h"

namespace palisade {
namespace {

using ::testing::ElementsAre;
using ::testing::Field;
using ::testing::IsEmpty;
using ::testing::SizeIs;

constexpr const char* revokingAll = "revokeAllAccessToAccountsOfType:store:withCompletion:";
constexpr const char* found = "Found %d authorized clients. Revoking all...";
constexpr const char* foundAppID = "Found Facebook app ID: %@ for client: %@";
constexpr const char* contacting = "Contacting vantad to invalidate token for client: %@";
constexpr const char* removing = "Removing credential from keychain for client: %@";

std::string quoted(const char* text) { return std::string("\"") + text + '"'; }

class RevokingAll : public ::testing::Test {
 protected:
  void addRecordOf(const std::string& id, const std::optional<Dictionary>& options, bool granted = true) {
    _scene.addRecord({.granted = granted, .options = options, .permissions = PermissionSet{"email"}},
                     _scene.platform.makeClient({.id = id, .bundleID = "org.example." + id, .description = "client " + id}));
    _scene.platform.keychain.addCredential("me", "org.example." + id, "client token");
  }

  std::size_t storedRecords() {
    const FaultInjector::Pause pause;
    return _scene.authorizations.allAuthorizationsForAccountType(*_scene.facebook).size();
  }

  Scene _scene;
  const Trace& _trace = _scene.platform.trace;
};

TEST_F(RevokingAll, InvalidatesEachTokenInOneSessionAndRemovesEveryRecord) {
  _scene.addAccount();
  addRecordOf("a", persistentOptions({}, "app a"));
  addRecordOf("b", std::nullopt);
  addRecordOf("c", persistentOptions({}, "app c"), false);

  EXPECT_THAT(_scene.revokeAll(), isGrant());

  EXPECT_THAT(stepsOf(_trace),
              ElementsAre("AccountStore.accountsWithAccountTypeIdentifier", "Account.setAccountType",
                          "AuthorizationManager.allAuthorizationsForAccountType", quoted(found), "FacebookSession.create",
                          quoted(foundAppID), quoted(contacting), "FacebookSession.revokeAccessTokenForAppWithID",
                          quoted(removing), "KeychainManager.removeCredentialForAccount", quoted(foundAppID),
                          quoted(foundAppID), quoted(contacting), "FacebookSession.revokeAccessTokenForAppWithID",
                          quoted(removing), "KeychainManager.removeCredentialForAccount",
                          "AuthorizationManager.removeAllClientAuthorizationsForAccountType", "completion"));
  EXPECT_THAT(_trace.named("FacebookSession.revokeAccessTokenForAppWithID"),
              ElementsAre(Field(&Event::members, Dictionary{{"session", 1}, {"appID", "app a"}}),
                          Field(&Event::members, Dictionary{{"session", 1}, {"appID", "app c"}})));
  const Value account = Dictionary{{"$account", "me"}};
  EXPECT_THAT(_trace.named("KeychainManager.removeCredentialForAccount"),
              ElementsAre(Field(&Event::members, Dictionary{{"account", account}, {"clientID", "org.example.a"}}),
                          Field(&Event::members, Dictionary{{"account", account}, {"clientID", "org.example.c"}})));
  EXPECT_EQ(_trace.named("AuthorizationManager.removeAllClientAuthorizationsForAccountType")[0].members,
            (Dictionary{{"accountType", AccountTypeIdentifierFacebook}}));
  EXPECT_EQ(storedRecords(), 0U);
  EXPECT_NE(_scene.platform.keychain.entry("me", "org.example.b"), nullptr) << "Without an app ID the credential stays.";
  EXPECT_NE(_scene.platform.keychain.entry("me", std::nullopt), nullptr) << "The account's own credential stays.";
}

TEST_F(RevokingAll, TellsTheLogEachClientAndItsBundle) {
  _scene.addAccount();
  addRecordOf("a", persistentOptions({}, "app a"));
  addRecordOf("b", Dictionary{{std::string(FacebookAppIdKey), 7}});
  addRecordOf("c", persistentOptions({}, ""));

  _scene.revokeAll();

  EXPECT_THAT(logLines(_trace), ElementsAre(LogLine{7, revokingAll, found, {"3"}, "clientAuthorizations.count"},
                                            LogLine{7, revokingAll, foundAppID, {"app a", "client a"}, "appID, client"},
                                            LogLine{7, revokingAll, contacting, {"client a"}, "client"},
                                            LogLine{7, revokingAll, removing, {"org.example.a"}, "client.bundleID"},
                                            LogLine{7, revokingAll, foundAppID, {"7", "client b"}, "appID, client"},
                                            LogLine{7, revokingAll, foundAppID, {"", "client c"}, "appID, client"},
                                            LogLine{7, revokingAll, contacting, {"client c"}, "client"},
                                            LogLine{7, revokingAll, removing, {"org.example.c"}, "client.bundleID"}));
}

TEST_F(RevokingAll, WithoutRecordsStillMakesASessionAndRemovesAll) {
  _scene.addAccount();

  EXPECT_THAT(_scene.revokeAll(), isGrant());

  EXPECT_THAT(stepsOf(_trace),
              ElementsAre("AccountStore.accountsWithAccountTypeIdentifier", "Account.setAccountType",
                          "AuthorizationManager.allAuthorizationsForAccountType", quoted(found), "FacebookSession.create",
                          "AuthorizationManager.removeAllClientAuthorizationsForAccountType", "completion"));
  EXPECT_THAT(logLines(_trace), ElementsAre(LogLine{7, revokingAll, found, {"0"}, "clientAuthorizations.count"}));
}

TEST_F(RevokingAll, WithoutAnAccountChangesNothing) {
  addRecordOf("a", persistentOptions());

  EXPECT_THAT(_scene.revokeAll(), isGrant());

  EXPECT_THAT(stepsOf(_trace), ElementsAre("AccountStore.accountsWithAccountTypeIdentifier",
                                           quoted("No Facebook account. What?"), "completion"));
  EXPECT_THAT(logLines(_trace), ElementsAre(LogLine{3, revokingAll, "No Facebook account. What?"}));
  EXPECT_EQ(storedRecords(), 1U);
}

TEST_F(RevokingAll, WritesNoAccessRequestRecordsAndChangesNoRecordByItself) {
  _scene.addAccount();
  addRecordOf("a", persistentOptions());
  _scene.revokeAll();
  EXPECT_THAT(_trace.named("logAccessRequest"), IsEmpty());
  EXPECT_THAT(_trace.named("AuthorizationManager.setAuthorization"), IsEmpty());
}

TEST_F(RevokingAll, SaysThatItWasHandledAlsoWhenStoreAndKeychainRefuse) {
  _scene.addAccount();
  addRecordOf("a", persistentOptions());
  addRecordOf("b", persistentOptions());
  _scene.authorizations.answerRemovals(Error{.domain = "store", .code = 1});
  _scene.platform.keychain.refuseRemovals(Error{.domain = "keychain", .code = 2});

  EXPECT_THAT(_scene.revokeAll(), isGrant());

  EXPECT_THAT(_trace.named("KeychainManager.removeCredentialForAccount"), SizeIs(2)) << "One refusal stops nothing.";
}

TEST_F(RevokingAll, LeavesRecordsOfOtherAccountTypesAlone) {
  _scene.addAccount();
  const ClientAuthorization record(_scene.client);
  _scene.authorizations.addRecord(record, "com.veltran.accounttype.other");
  EXPECT_THAT(_scene.revokeAll(), isGrant());
  EXPECT_NE(_scene.authorizations.recordOf(*_scene.client, "com.veltran.accounttype.other"), nullptr);
}

TEST_F(RevokingAll, MakesEveryClientAskTheUserAgain) {
  _scene.addAccount();
  _scene.addRecord({.options = persistentOptions(), .permissions = PermissionSet{"email"}});
  _scene.revokeAll();
  _scene.platform.alert.answers = {userRefuses()};
  EXPECT_THAT(_scene.requestAccess(optionsAskingFor({"email"})), isRefusalWith(accountsError(7)));
  EXPECT_THAT(consentAskedFor(_trace), ElementsAre("{email}"));
}

}  // namespace
}  // namespace palisade
