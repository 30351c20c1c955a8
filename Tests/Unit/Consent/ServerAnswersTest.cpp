// What the plug-in makes of the server's answer to a request for a token, for every kind of JSON in every place.

#include <gmock/gmock.h>

#include "Tests/Unit/Consent/ConsentScene.h"

namespace palisade {
namespace {

using namespace std::string_literals;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::Optional;
using ::testing::SizeIs;

constexpr const char* answeredOperation = "_getServerAuthorizationForClient:withAppID:permissions:audience:account:completion:";

Error noToken(const std::string& reason) {
  return accountsError(7, "The Facebook server could not fulfill this access request: " + reason);
}

LogLine response(std::string rendered) {
  return {.level = 7,
          .operation = answeredOperation,
          .format = "Access request response: %@",
          .arguments = {std::move(rendered)},
          .argumentNames = "response"};
}

class AnAnswer : public ::testing::Test, protected ConsentScene {
 protected:
  std::vector<ServerAuthorization> answersTo(const std::string& body) {
    serverAnswers({.data = body});
    platform.trace.clear();
    return askServer();
  }

  void expectNothingStored() {
    EXPECT_THAT(platform.trace.named("Account.setCredential"), IsEmpty());
    EXPECT_THAT(platform.trace.named("KeychainManager.setCredentialForAccount"), IsEmpty());
    EXPECT_EQ(platform.keychain.entry("me", "org.example.photos"), nullptr);
  }
};

TEST_F(AnAnswer, WithATokenAndPermissionsIsAGrantOfThem) {
  EXPECT_THAT(answersTo(R"({"access_token":"T","permissions":["user_likes","email"]})"),
              ElementsAre(isServerGrant(Array{"user_likes", "email"})));

  EXPECT_THAT(logLines(platform.trace), ElementsAre(response(R"({"access_token":"T","permissions":["user_likes","email"]})")));
}

TEST_F(AnAnswer, ThatIsAnEmptyObjectIsARefusalThatQuotesNothing) {
  EXPECT_THAT(answersTo("{}"), ElementsAre(isServerRefusal(noToken("(null)"))));

  EXPECT_THAT(logLines(platform.trace), ElementsAre(response("{}")));
  expectNothingStored();
}

TEST_F(AnAnswer, WhoseTokenIsNoStringIsARefusalAndStoresNothing) {
  for (const char* token : {"1", "1.5", "null", "true", "[]", R"(["T"])", "{}", R"({"T":"T"})"}) {
    EXPECT_THAT(answersTo(R"({"access_token":)"s + token + R"(,"permissions":["email"]})"),
                ElementsAre(isServerRefusal(noToken("(null)"))))
        << token;
    expectNothingStored();
  }
}

TEST_F(AnAnswer, WithATokenOfAnyTextIsAGrantThatKeepsItAsItStands) {
  for (const std::string token : {"T", "", " ", "%@", "API_EC_PARAM"}) {
    EXPECT_THAT(answersTo(R"({"access_token":")" + token + R"("})"), ElementsAre(isServerGrant(std::nullopt)));
    const auto stored = platform.keychain.entry("me", "org.example.photos");
    ASSERT_NE(stored, nullptr);
    EXPECT_THAT(stored->oauthToken(), Optional(token));
  }
}

TEST_F(AnAnswer, WhosePermissionsAreNoArrayIsAGrantWithoutAnyAndStoresTheToken) {
  for (const char* permissions : {R"("email")", "null", "true", "1", "{}", R"({"email":1})"}) {
    EXPECT_THAT(answersTo(R"({"access_token":"T","permissions":)"s + permissions + "}"),
                ElementsAre(isServerGrant(std::nullopt)))
        << permissions;
    EXPECT_NE(platform.keychain.entry("me", "org.example.photos"), nullptr);
    platform.keychain.removeCredentialForAccount(account, "org.example.photos");
  }
}

TEST_F(AnAnswer, PassesAnArrayOfPermissionsOnAsItStands) {
  const std::pair<const char*, Array> cases[] = {
      {"[]", {}},
      {R"(["email","email"])", {"email", "email"}},
      {R"(["email",1,null,["user_likes"],{}])", {"email", 1, nullptr, Array{"user_likes"}, Dictionary()}},
  };
  for (const auto& [permissions, array] : cases) {
    EXPECT_THAT(answersTo(R"({"access_token":"T","permissions":)"s + permissions + "}"), ElementsAre(isServerGrant(array)));
  }
}

TEST_F(AnAnswer, QuotesTheServersReasonStringsAsTheyAreAndAllElseAsCompactJson) {
  const std::pair<const char*, const char*> cases[] = {
      {R"("No such app")", "No such app"},
      {R"("")", ""},
      {R"("%@ %d")", "%@ %d"},
      {R"("a \"b\"\n")", "a \"b\"\n"},
      {"null", "(null)"},
      {"true", "true"},
      {"190", "190"},
      {"1.50", "1.5"},
      {"18446744073709551615", "18446744073709551615"},
      {R"([ "a", 1 ])", R"(["a",1])"},
      {R"({ "code": 190, "text": "a\"b" })", R"({"code":190,"text":"a\"b"})"},
  };
  for (const auto& [reason, quoted] : cases) {
    EXPECT_THAT(answersTo(R"({"error_msg":)"s + reason + "}"), ElementsAre(isServerRefusal(noToken(quoted)))) << reason;
    expectNothingStored();
  }
}

TEST_F(AnAnswer, ThatHoldsATokenIsAGrantWhateverItsReasonSays) {
  EXPECT_THAT(answersTo(R"({"error_msg":"No such app","access_token":"T"})"), ElementsAre(isServerGrant(std::nullopt)));
}

TEST_F(AnAnswer, LooksForItsMembersUnderExactlyTheirNames) {
  EXPECT_THAT(answersTo(R"({"Access_token":"T","access_token ":"T","ERROR_MSG":"x","data":{"access_token":"T"}})"),
              ElementsAre(isServerRefusal(noToken("(null)"))));
  expectNothingStored();
}

TEST_F(AnAnswer, ThatIsNoObjectIsLoggedAndTreatedAsOneWithoutMembers) {
  const std::pair<const char*, const char*> cases[] = {
      {"null", "null"},
      {"true", "true"},
      {"0", "0"},
      {"1.5", "1.5"},
      {R"("access_token")", "access_token"},
      {"[]", "[]"},
      {R"(["access_token", "T"])", R"(["access_token","T"])"},
      {R"([{"access_token":"T"}])", R"([{"access_token":"T"}])"},
  };
  for (const auto& [body, logged] : cases) {
    EXPECT_THAT(answersTo(body), ElementsAre(isServerRefusal(noToken("(null)")))) << body;
    EXPECT_THAT(logLines(platform.trace), ElementsAre(response(logged)));
    expectNothingStored();
  }
}

TEST_F(AnAnswer, ThatIsNotJsonIsARefusalWithTheParsersError) {
  const std::string bodies[] = {
      "",
      " ",
      "<html>Bad Gateway</html>",
      R"({"access_token":"T")",
      R"({"access_token":"T"} {})",
      R"({"access_token":"T","access_token":"T"})",
      R"({'access_token':'T'})",
      "{\"access_token\":\"\xff\"}",
      "{\"access_token\":\"T\0\"}"s,
      R"({"access_token":"T","number":1e400})",
      R"({"access_token":"T","deep":)" + std::string(100'000, '[') + std::string(100'000, ']') + "}",
      std::string(100'000, '{'),
  };
  for (const std::string& body : bodies) {
    const std::vector<ServerAuthorization> answers = answersTo(body);

    ASSERT_THAT(answers, SizeIs(1));
    EXPECT_THAT(answers.front(), isServerRefusal(answers.front().error));
    ASSERT_TRUE(answers.front().error.has_value()) << body.substr(0, 100);
    EXPECT_EQ(answers.front().error->domain, JsonErrorDomain);
    EXPECT_THAT(logLines(platform.trace),
                ElementsAre(LogLine{.level = 3,
                                    .operation = answeredOperation,
                                    .format = "VXFacebookAccountAccessPlugin could not parse server response: %@.",
                                    .arguments = {describe(*answers.front().error)},
                                    .argumentNames = "error"}));
    expectNothingStored();
  }
}

TEST_F(AnAnswer, IsNotSpoiledByANullCharacterInAMemberThatNobodyReads) {
  EXPECT_THAT(answersTo(R"({"nul\u0000":"\u0000","access_token":"T","permissions":["email"]})"),
              ElementsAre(isServerGrant(Array{"email"})));
  const auto stored = platform.keychain.entry("me", "org.example.photos");
  ASSERT_NE(stored, nullptr);
  EXPECT_THAT(stored->oauthToken(), Optional(std::string("T")));
}

TEST_F(AnAnswer, HandsATokenWithANullCharacterToTheKeychainThatRefusesIt) {
  platform.keychain.refuseWrites(Error{.domain = "keychain", .code = 1});
  EXPECT_THAT(answersTo(R"({"access_token":"T\u0000T"})"), ElementsAre(isServerGrant(std::nullopt)));
  EXPECT_THAT(platform.trace.named("KeychainManager.setCredentialForAccount"), SizeIs(1));
  EXPECT_EQ(platform.keychain.entry("me", "org.example.photos"), nullptr);
}

TEST_F(AnAnswer, IsReadBehindAByteOrderMark) {
  EXPECT_THAT(answersTo("\xEF\xBB\xBF{\"access_token\":\"T\"}"), ElementsAre(isServerGrant(std::nullopt)));
}

TEST_F(AnAnswer, IsReadWhateverTheStatusOfTheHttpResponse) {
  serverAnswers({.data = R"({"access_token":"T"})", .statusCode = 500});
  EXPECT_THAT(askServer(), ElementsAre(isServerGrant(std::nullopt)));
}

TEST_F(AnAnswer, MayBeAMegabyteLong) {
  const std::string megabyte(1 << 20, 'x');
  EXPECT_THAT(answersTo(R"({"error_msg":")" + megabyte + R"("})"), ElementsAre(isServerRefusal(noToken(megabyte))));
}

}  // namespace
}  // namespace palisade
