// Taking back one client's grant.

#include <ostream>
#include <string>
#include <vector>

#include <gmock/gmock.h>

#include "Tests/Unit/Access/OptionKeys.h"
#include "Tests/Unit/Support/Scene.h"

namespace palisade {
namespace {

using ::testing::ElementsAre;
using ::testing::Field;
using ::testing::IsEmpty;

constexpr const char* revoking = "revokeAccessToAccountsOfType:forClient:store:completion:";
constexpr const char* photosInLog = "org.example.photos (Photos)";

const Dictionary auditOfRevocation{{"accountType", AccountTypeIdentifierFacebook},
                                   {"bundleID", "org.example.photos"},
                                   {"granted", false},
                                   {"userPrompted", false},
                                   {"elapsed", 0.0}};

const RecordData grantedToFriends{.options = persistentOptions(FacebookAudienceFriends), .permissions = PermissionSet{"email"}};
const RecordData cleared{.granted = false, .options = persistentOptions(FacebookAudienceFriends)};

TEST(ARevocation, InvalidatesTheTokenRemovesTheCredentialAndClearsTheRecord) {
  Scene scene;
  scene.addAccount();
  scene.addRecord(grantedToFriends);
  scene.platform.keychain.addCredential("me", "org.example.photos", "client token");

  EXPECT_THAT(scene.revoke(), isGrant());

  const Trace& trace = scene.platform.trace;
  EXPECT_THAT(stepsOf(trace),
              ElementsAre("AccountStore.accountsWithAccountTypeIdentifier", "Account.setAccountType",
                          "AuthorizationManager.authorizationForClient", "\"Found Facebook app ID: %@ for client: %@\"",
                          "\"Contacting vantad to invalidate token for client: %@\"", "FacebookSession.create",
                          "FacebookSession.revokeAccessTokenForAppWithID",
                          "\"Removing credential from keychain for client: %@\"", "KeychainManager.removeCredentialForAccount",
                          "AuthorizationManager.setAuthorization", "logAccessRequest", "completion"));
  EXPECT_EQ(trace.named("FacebookSession.revokeAccessTokenForAppWithID")[0].members,
            (Dictionary{{"session", 1}, {"appID", photosAppID}}));
  EXPECT_EQ(trace.named("KeychainManager.removeCredentialForAccount")[0].members,
            (Dictionary{{"account", Dictionary{{"$account", "me"}}}, {"clientID", "org.example.photos"}}));
  EXPECT_THAT(trace.named("logAccessRequest"), ElementsAre(Field(&Event::members, auditOfRevocation)));
  EXPECT_EQ(scene.record(), cleared);
  EXPECT_EQ(scene.platform.keychain.entry("me", "org.example.photos"), nullptr);
  EXPECT_NE(scene.platform.keychain.entry("me", std::nullopt), nullptr) << "The account's own credential stays.";
}

TEST(ARevocation, TellsTheLogWhatItDoes) {
  Scene scene;
  scene.addAccount();
  scene.addRecord(grantedToFriends);
  scene.revoke();
  EXPECT_THAT(
      logLines(scene.platform.trace),
      ElementsAre(LogLine{7, revoking, "Found Facebook app ID: %@ for client: %@", {photosAppID, photosInLog}, "appID, client"},
                  LogLine{7, revoking, "Contacting vantad to invalidate token for client: %@", {photosInLog}, "client"},
                  LogLine{7, revoking, "Removing credential from keychain for client: %@", {photosInLog}, "client"}));
}

TEST(ARevocation, OfARefusedClientIsHandledLikeAnyOther) {
  Scene scene;
  scene.addAccount();
  scene.addRecord(cleared);
  EXPECT_THAT(scene.revoke(), isGrant());
  EXPECT_EQ(scene.platform.trace.named("FacebookSession.revokeAccessTokenForAppWithID").size(), 1U);
  EXPECT_EQ(scene.record(), cleared);
}

TEST(ARevocation, LooksUpNoRecordWithoutAnAccount) {
  Scene scene;
  scene.addRecord(grantedToFriends);
  EXPECT_THAT(scene.revoke(), isGrant());
  EXPECT_THAT(stepsOf(scene.platform.trace), ElementsAre("AccountStore.accountsWithAccountTypeIdentifier", "completion"));
  EXPECT_EQ(scene.record(), grantedToFriends);
}

TEST(ARevocation, IgnoresAClientWithoutARecord) {
  Scene scene;
  scene.addAccount();
  scene.addRecord(grantedToFriends, scene.platform.makeClient({.id = "another client"}));

  EXPECT_THAT(scene.revoke(), isGrant());

  EXPECT_THAT(stepsOf(scene.platform.trace),
              ElementsAre("AccountStore.accountsWithAccountTypeIdentifier", "Account.setAccountType",
                          "AuthorizationManager.authorizationForClient",
                          "\"Client %@ does not have an exiting ClientAuthorization. Ignoring...\"", "completion"));
  EXPECT_THAT(
      logLines(scene.platform.trace),
      ElementsAre(LogLine{
          7, revoking, "Client %@ does not have an exiting ClientAuthorization. Ignoring...", {photosInLog}, "client"}));
}

struct StoredAppID {
  const char* name;
  std::optional<Dictionary> options;
  std::string logged;
};

void PrintTo(const StoredAppID& stored, std::ostream* stream) { *stream << stored.name; }

class ARecordWithoutAUsableAppID : public ::testing::TestWithParam<StoredAppID> {};

TEST_P(ARecordWithoutAUsableAppID, IsClearedWithoutTouchingTokenOrCredential) {
  Scene scene;
  scene.addAccount();
  scene.addRecord({.options = GetParam().options, .permissions = PermissionSet{"email"}});
  scene.platform.keychain.addCredential("me", "org.example.photos", "client token");

  EXPECT_THAT(scene.revoke(), isGrant());

  EXPECT_THAT(stepsOf(scene.platform.trace),
              ElementsAre("AccountStore.accountsWithAccountTypeIdentifier", "Account.setAccountType",
                          "AuthorizationManager.authorizationForClient", "\"Found Facebook app ID: %@ for client: %@\"",
                          "AuthorizationManager.setAuthorization", "logAccessRequest", "completion"));
  EXPECT_THAT(logLines(scene.platform.trace),
              ElementsAre(LogLine{
                  7, revoking, "Found Facebook app ID: %@ for client: %@", {GetParam().logged, photosInLog}, "appID, client"}));
  EXPECT_THAT(scene.platform.trace.named("logAccessRequest"), ElementsAre(Field(&Event::members, auditOfRevocation)));
  EXPECT_EQ(scene.record(), (RecordData{.granted = false, .options = GetParam().options}));
  EXPECT_NE(scene.platform.keychain.entry("me", "org.example.photos"), nullptr);
}

INSTANTIATE_TEST_SUITE_P(, ARecordWithoutAUsableAppID,
                         ::testing::Values(StoredAppID{"NoOptions", std::nullopt, "(null)"},
                                           StoredAppID{"NoAppID", Dictionary{{"further key", "1"}}, "(null)"},
                                           StoredAppID{"ANumber", Dictionary{{appIDKey, 1234}}, "1234"},
                                           StoredAppID{"ABoolean", Dictionary{{appIDKey, true}}, "true"},
                                           StoredAppID{"Null", Dictionary{{appIDKey, nullptr}}, "null"},
                                           StoredAppID{"AnArray", Dictionary{{appIDKey, Array{"1"}}}, "[\"1\"]"}),
                         nameOfCase<StoredAppID>);

TEST(ARecordWithAnEmptyAppID, HasAnAppID) {
  Scene scene;
  scene.addAccount();
  scene.addRecord({.options = Dictionary{{appIDKey, ""}}});
  EXPECT_THAT(scene.revoke(), isGrant());
  EXPECT_EQ(scene.platform.trace.named("FacebookSession.revokeAccessTokenForAppWithID").at(0)["appID"], Value(""));
  EXPECT_EQ(scene.platform.trace.named("KeychainManager.removeCredentialForAccount").size(), 1U);
}

TEST(ARevocation, SaysThatItWasHandledAlsoWhenStoreAndKeychainRefuse) {
  Scene scene;
  scene.addAccount();
  scene.addRecord(grantedToFriends);
  scene.authorizations.answerWrites({Error{.domain = "store", .code = 1}});
  scene.platform.keychain.refuseRemovals(Error{.domain = "keychain", .code = 2});

  EXPECT_THAT(scene.revoke(), isGrant());

  EXPECT_THAT(scene.platform.trace.named("logAccessRequest"), ElementsAre(Field(&Event::members, auditOfRevocation)));
  EXPECT_EQ(scene.record(), grantedToFriends);
}

TEST(ARevocation, IsHandledOnceTheRecordIsClearedEvenIfNobodyCanWriteThatDown) {
  Scene scene;
  scene.addAccount();
  scene.addRecord(grantedToFriends);
  scene.platform.faults.throwOn("Log.logAccessRequest");
  EXPECT_THAT(scene.revoke(), isGrant());
  EXPECT_EQ(scene.record(), cleared);
}

TEST(ARevocation, LeavesOtherClientsAndOtherAccountsAlone) {
  Scene scene;
  scene.addAccount("first");
  scene.addAccount("second");
  const auto other = scene.platform.makeClient({.id = "other", .bundleID = "org.example.other"});
  scene.addRecord(grantedToFriends);
  scene.addRecord(grantedToFriends, other);
  for (const char* account : {"first", "second"}) {
    for (const char* bundleID : {"org.example.photos", "org.example.other"}) {
      scene.platform.keychain.addCredential(account, bundleID, "client token");
    }
  }

  EXPECT_THAT(scene.revoke(), isGrant());

  EXPECT_TRUE(scene.authorizations.recordOf(*other, scene.facebook->identifier())->isGranted());
  EXPECT_EQ(scene.platform.keychain.entry("first", "org.example.photos"), nullptr);
  EXPECT_NE(scene.platform.keychain.entry("first", "org.example.other"), nullptr);
  EXPECT_NE(scene.platform.keychain.entry("second", "org.example.photos"), nullptr);
}

TEST(ARevokedClient, IsRefusedWhenItAsksAgain) {
  Scene scene;
  scene.addAccount();
  scene.addRecord(grantedToFriends);
  scene.platform.alert.answers = {userAllows()};
  EXPECT_THAT(scene.revoke(), isGrant());
  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email"})), isRefusalWithoutError());
}

}  // namespace
}  // namespace palisade
