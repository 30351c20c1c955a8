// A client's token in the keychain.

#include <gmock/gmock.h>

#include "Testing/TraceValue.h"
#include "Tests/Unit/Consent/ConsentScene.h"

namespace palisade {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::IsNull;
using ::testing::NotNull;
using ::testing::Optional;

class TheClientsToken : public ::testing::Test, protected ConsentScene {};

TEST_F(TheClientsToken, IsSetOnTheAccountAndThenWrittenUnderTheBundleID) {
  plugin->_saveCredentialForClient(client, account, "T");

  const Value credential = Dictionary{{"token", "T"}, {"refreshToken", ""}, {"expiryDate", "distantFuture"}};
  const Value traced = traceAccount(account.get());
  ASSERT_THAT(platform.trace.names(), ElementsAre("Account.setCredential", "KeychainManager.setCredentialForAccount"));
  EXPECT_EQ(platform.trace.events()[0].members, (Dictionary{{"account", traced}, {"credential", credential}}));
  EXPECT_EQ(platform.trace.events()[1].members,
            (Dictionary{{"account", traced}, {"clientID", "org.example.photos"}, {"credential", credential}}));
}

TEST_F(TheClientsToken, ThatIsNoneStoresNothingAndChangesNoAccount) {
  plugin->_saveCredentialForClient(client, account, std::nullopt);

  EXPECT_THAT(platform.trace.events(), IsEmpty());
  EXPECT_THAT(account->credential(), IsNull());
}

TEST_F(TheClientsToken, ThatIsEmptyIsStoredLikeAnyOther) {
  plugin->_saveCredentialForClient(client, account, "");

  ASSERT_THAT(platform.keychain.entry("me", "org.example.photos"), NotNull());
  EXPECT_THAT(platform.keychain.entry("me", "org.example.photos")->oauthToken(), Optional(std::string()));
}

TEST_F(TheClientsToken, HasNoRefreshTokenAndNoEndWhateverTheServerSent) {
  serverAnswers({.data = R"({"access_token":"T","refresh_token":"R","expires_in":5,"expiry_date":"2020-01-01"})"});
  askServer();

  const auto stored = platform.keychain.entry("me", "org.example.photos");
  ASSERT_THAT(stored, NotNull());
  EXPECT_THAT(stored->oauthToken(), Optional(std::string("T")));
  EXPECT_EQ(stored->refreshToken(), "");
  EXPECT_EQ(stored->expiryDate(), distantFuture);
}

TEST_F(TheClientsToken, LeavesTheMasterTokenAlone) {
  plugin->_saveCredentialForClient(client, account, "T");

  ASSERT_THAT(platform.keychain.entry("me", std::nullopt), NotNull());
  EXPECT_THAT(platform.keychain.entry("me", std::nullopt)->oauthToken(), Optional(std::string("master token of me")));
}

TEST_F(TheClientsToken, TakesThePlaceOfAnEarlierOne) {
  plugin->_saveCredentialForClient(client, account, "first");
  plugin->_saveCredentialForClient(client, account, "second");

  EXPECT_THAT(platform.keychain.entry("me", "org.example.photos")->oauthToken(), Optional(std::string("second")));
}

TEST_F(TheClientsToken, OfAClientWithoutABundleIDIsWrittenUnderNone) {
  plugin->_saveCredentialForClient(platform.makeClient({.id = "script"}), account, "T");

  EXPECT_THAT(members(platform.trace, "KeychainManager.setCredentialForAccount", "clientID"), ElementsAre(Value()));
}

TEST_F(TheClientsToken, ThatTheKeychainRefusesGoesUnnoticed) {
  platform.keychain.refuseWrites(Error{.domain = "org.example.keychain", .code = 1});
  serverAnswers(serverIssues("T", R"(["email"])"));

  EXPECT_THAT(askServer(), ElementsAre(isServerGrant(Array{"email"})));
  EXPECT_THAT(account->credential(), NotNull());
  EXPECT_THAT(platform.keychain.entry("me", "org.example.photos"), IsNull());
}

}  // namespace
}  // namespace palisade
