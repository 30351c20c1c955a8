// Permissions that no list knows: the server describes them, and the caller waits for it.

#include <gmock/gmock.h>

#include "Testing/TraceValue.h"
#include "Tests/Unit/Consent/ConsentScene.h"

namespace palisade {
namespace {

using ::testing::ElementsAre;
using ::testing::Eq;
using ::testing::IsEmpty;
using ::testing::Optional;

constexpr const char* fetch = "_fetchDescriptionForUnknownPermissions:audience:account:";

const Error networkIsDown{.domain = "org.example.network", .code = 7, .description = "No route to host"};

LogLine errorContacting(std::string error) {
  return {.level = 3,
          .operation = fetch,
          .format = "Error contacting Facebook server for permission description: %@",
          .arguments = {std::move(error)},
          .argumentNames = "error"};
}

LogLine serverDescription(std::string permissions, std::string description) {
  return {.level = 7,
          .operation = fetch,
          .format = "Server description for %@ was: %@",
          .arguments = {std::move(permissions), std::move(description)},
          .argumentNames = "permissions, description"};
}

class ADescription : public ::testing::Test, protected ConsentScene {};

TEST_F(ADescription, IsAskedForWithThePermissionsTheAudienceAndTheMasterToken) {
  serverDescribes(R"("new things")");

  EXPECT_THAT(fetchDescription(permissionSet({"b", "a"}), std::string(FacebookAudienceFriends)), Optional(Eq("new things")));

  EXPECT_THAT(platform.trace.names(),
              ElementsAre("FacebookPermissionDescriptionRequest.init", "KeychainManager.credentialForAccount",
                          "FacebookPermissionDescriptionRequest.setAccessToken",
                          "FacebookPermissionDescriptionRequest.performRequestWithHandler", "log"));
  const std::vector<Event> events = platform.trace.events();
  EXPECT_EQ(events[0].members, (Dictionary{{"permissions", traceSet(permissionSet({"a", "b"}))}, {"audience", "ALL_FRIENDS"}}));
  EXPECT_EQ(events[1].members, (Dictionary{{"account", traceAccount(account.get())}, {"clientID", nullptr}}));
  EXPECT_EQ(events[2].members, (Dictionary{{"token", "master token of me"}}));
  EXPECT_THAT(logLines(platform.trace), ElementsAre(serverDescription("{a, b}", "new things")));
}

TEST_F(ADescription, IsAskedForWithoutAnAudienceThatTheServerDoesNotKnow) {
  for (const std::optional<std::string>& audience : {std::optional<std::string>(), std::optional<std::string>("SELF")}) {
    serverDescribes(R"("it")");
    platform.trace.clear();
    fetchDescription(permissionSet({"a"}), audience);
    EXPECT_THAT(members(platform.trace, "FacebookPermissionDescriptionRequest.init", "audience"), ElementsAre(Value()));
  }
}

TEST_F(ADescription, IsAskedForAlsoWithoutAMasterTokenAndNothingIsLoggedAboutIt) {
  const struct {
    const char* account;
    std::optional<std::string> token;
    Value given;
  } cases[] = {{"empty", "", ""}, {"none", std::nullopt, nullptr}};
  for (const auto& [id, token, given] : cases) {
    const auto without = makeAccount(id);
    platform.keychain.addCredential(id, std::nullopt, token);
    serverDescribes(R"("it")");
    platform.trace.clear();

    std::optional<std::string> description;
    platform.run(
        [&] { description = plugin->_fetchDescriptionForUnknownPermissions(permissionSet({"a"}), std::nullopt, without); });

    EXPECT_THAT(description, Optional(Eq("it")));
    EXPECT_THAT(members(platform.trace, "FacebookPermissionDescriptionRequest.setAccessToken", "token"), ElementsAre(given));
    EXPECT_THAT(logLines(platform.trace), ElementsAre(serverDescription("{a}", "it")));
  }
}

TEST_F(ADescription, IsAskedForAlsoWithoutACredential) {
  const auto stranger = std::make_shared<FakeAccount>(Instruments{platform.trace, platform.faults},
                                                      FakeAccountData{.id = "stranger", .type = ""});
  serverDescribes(R"("it")");

  platform.run([&] { plugin->_fetchDescriptionForUnknownPermissions(permissionSet({"a"}), std::nullopt, stranger); });

  EXPECT_THAT(members(platform.trace, "FacebookPermissionDescriptionRequest.setAccessToken", "token"), ElementsAre(Value()));
}

TEST_F(ADescription, OfPermissionsThatTheServerCannotDescribeIsNone) {
  serverDescribes(R"("API_EC_PARAM")");

  EXPECT_EQ(fetchDescription(permissionSet({"a"})), std::nullopt);

  EXPECT_THAT(logLines(platform.trace), ElementsAre(serverDescription("{a}", "API_EC_PARAM")));
}

TEST_F(ADescription, IsOnlyRefusedByExactlyTheServersWord) {
  for (const std::string word : {"api_ec_param", "API_EC_PARAM ", "API_EC_PARAM_SESSION_KEY", "The API_EC_PARAM"}) {
    serverDescribes('"' + word + '"');
    EXPECT_THAT(fetchDescription(permissionSet({"a"})), Optional(word));
  }
}

TEST_F(ADescription, MayBeEmpty) {
  serverDescribes(R"("")");

  EXPECT_THAT(fetchDescription(permissionSet({"a"})), Optional(std::string()));
  EXPECT_THAT(logLines(platform.trace), ElementsAre(serverDescription("{a}", "")));
}

TEST_F(ADescription, IsNoneWhenTheServerCannotBeReached) {
  const std::pair<ServerAnswer, const char*> cases[] = {
      {{.error = networkIsDown}, "org.example.network 7: No route to host"},
      {{.data = R"("new things")", .error = networkIsDown}, "org.example.network 7: No route to host"},
      {{}, "(null)"},
  };
  for (const auto& [answer, logged] : cases) {
    platform.social.descriptionAnswers = {answer};
    platform.trace.clear();

    EXPECT_EQ(fetchDescription(permissionSet({"a"})), std::nullopt);
    EXPECT_THAT(logLines(platform.trace), ElementsAre(errorContacting(logged)));
  }
}

TEST_F(ADescription, DoesNotDependOnTheStatusOfTheHttpResponse) {
  platform.social.descriptionAnswers = {{.data = R"("new things")", .statusCode = 500}};

  EXPECT_THAT(fetchDescription(permissionSet({"a"})), Optional(Eq("new things")));
}

TEST_F(ADescription, CountsTheFirstTimeItArrives) {
  platform.social.descriptionAnswers = {{.data = R"("new things")", .delivery = Delivery::twice}};

  EXPECT_THAT(fetchDescription(permissionSet({"a"})), Optional(Eq("new things")));
  EXPECT_THAT(logLines(platform.trace), ElementsAre(serverDescription("{a}", "new things")));
}

TEST_F(ADescription, MayArriveBeforeItIsWaitedFor) {
  platform.social.descriptionAnswers = {{.data = R"("new things")", .delivery = Delivery::inLine}};

  EXPECT_THAT(fetchDescription(permissionSet({"a"})), Optional(Eq("new things")));
}

TEST_F(ADescription, IsReadOnTheThreadThatBringsItWhileTheCallerWaits) {
  serverDescribes(R"("new things")");
  fetchDescription(permissionSet({"a"}));

  EXPECT_EQ(platform.trace.events().back().name, "log");
  EXPECT_EQ(platform.trace.events().back().thread, nameOf(ThreadLabel::request));
}

TEST_F(ADescription, ThatNeverArrivesIsWaitedForForEver) {
  platform.social.descriptionAnswers = {{.data = R"("late")", .delivery = Delivery::never}};

  // The thread stays behind with the plug-in and the account.
  const OperationEnd end = platform.run([waiting = plugin, account = account] {
    waiting->_fetchDescriptionForUnknownPermissions(permissionSet({"a"}), std::nullopt, account);
  });

  EXPECT_EQ(end, OperationEnd::waitsForSemaphore);
}

TEST_F(ADescription, WhoseRequestWasDroppedEndsTheRequestForAccessWithARefusal) {
  addAccount();
  platform.social.descriptionAnswers = {{.delivery = Delivery::dropped}};

  EXPECT_THAT(requestAccess(optionsAskingFor({"new_thing"})), isUnexpectedFailureAnswer());
  EXPECT_EQ(record(), std::nullopt);
}

class TheAppendedSentence : public ::testing::Test, protected ConsentScene {};

TEST_F(TheAppendedSentence, FollowsTheMessageAfterOneSpace) {
  serverDescribes(R"("new things")");

  EXPECT_THAT(appendDescription("It wants to read."),
              Optional("It wants to read. " + shown("ACCOUNT_ACCESS_UNKNOWN_ADDITIONAL_FORMAT", {"new things"})));
}

TEST_F(TheAppendedSentence, FollowsAnEmptyMessageToo) {
  serverDescribes(R"("new things")");

  EXPECT_THAT(appendDescription(""), Optional(" " + shown("ACCOUNT_ACCESS_UNKNOWN_ADDITIONAL_FORMAT", {"new things"})));
}

TEST_F(TheAppendedSentence, IsTheWholeMessageWhereThereIsNone) {
  serverDescribes(R"("new things")");

  EXPECT_THAT(appendDescription(std::nullopt), Optional(shown("ACCOUNT_ACCESS_UNKNOWN_FORMAT", {"Photos", "new things"})));
}

TEST_F(TheAppendedSentence, CopiesWhatLooksLikeAFormatFromEverySide) {
  serverDescribes(R"("%@ %d %%")");

  EXPECT_THAT(appendDescription("%@ M %d"),
              Optional("%@ M %d " + shown("ACCOUNT_ACCESS_UNKNOWN_ADDITIONAL_FORMAT", {"%@ %d %%"})));
  EXPECT_THAT(appendDescription(std::nullopt, "%@"), Optional(shown("ACCOUNT_ACCESS_UNKNOWN_FORMAT", {"%@", "%@ %d %%"})));
}

TEST_F(TheAppendedSentence, TakesTheMessageAwayWhenThereIsNoDescription) {
  const ServerAnswer answers[] = {
      {.error = networkIsDown},          {},           {.data = R"("API_EC_PARAM")"}, {.data = R"("")"},
      {.data = R"({"description": 1})"}, {.data = ""},
  };
  for (const ServerAnswer& answer : answers) {
    platform.social.descriptionAnswers = {answer};
    EXPECT_EQ(appendDescription("It wants to read."), std::nullopt);
    EXPECT_EQ(appendDescription(std::nullopt), std::nullopt);
  }
  EXPECT_THAT(platform.strings.lookups(), IsEmpty());
}

TEST_F(TheAppendedSentence, LooksUpTheFormatThatItUsesAndNoOther) {
  serverDescribes(R"("new things")");
  appendDescription("M");
  appendDescription(std::nullopt);

  std::vector<std::string> keys;
  for (const auto& lookup : platform.strings.lookups()) keys.push_back(lookup.key);
  EXPECT_THAT(keys, ElementsAre("ACCOUNT_ACCESS_UNKNOWN_ADDITIONAL_FORMAT", "ACCOUNT_ACCESS_UNKNOWN_FORMAT"));
}

}  // namespace
}  // namespace palisade
