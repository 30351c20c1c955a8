// Random requests: what the plug-in does with them against what the model says, and the one promise that no request may break.

#include <random>
#include <string>
#include <vector>

#include <gmock/gmock.h>

#include "Tests/Unit/Access/AccessModel.h"
#include "Tests/Unit/Support/Scene.h"

namespace palisade {
namespace {

using model::Names;

// Random requests that are more often sensible than not, so that every branch is reached often.
class Dice {
 public:
  explicit Dice(std::uint64_t seed) : _engine(seed) {}

  bool oneIn(unsigned chances) { return std::uniform_int_distribution<unsigned>(1, chances)(_engine) == 1; }

  template <typename Choice>
  Choice oneOf(const std::vector<Choice>& choices) {
    return choices[std::uniform_int_distribution<std::size_t>(0, choices.size() - 1)(_engine)];
  }

  Names names() {
    static const std::vector<std::string> all{
        "email",       "user_likes", "friends_likes", "publish", "publish_stream", "publish_actions", "manage_pages",
        "unknown_one", "unknown2",   "Publish",       ""};
    Names names;
    for (int more = oneOf<int>({0, 1, 1, 2, 3, 5}); more > 0; --more) names.insert(oneIn(4) ? oneOf(all) : oneOf(_common));
    return names;
  }

  model::Options persistentOptions() {
    model::Options options;
    if (!oneIn(20)) options.appID = oneIn(10) ? oneOf<Value>({"", 7, nullptr, Array{"1"}}) : oneOf<Value>({"1", "1", "1", "2"});
    if (!oneIn(4)) options.audience = oneIn(10) ? oneOf<Value>({7, nullptr, "", "Martians", Array{}}) : oneOf(_audiences);
    return options;
  }

  model::Options options() {
    model::Options options = persistentOptions();
    if (oneIn(20)) {
      options.permissions = oneOf<Value>({"email", nullptr, Dictionary{}, 1});
    } else if (!oneIn(20)) {
      const Names asked = names();
      Array elements(asked.begin(), asked.end());
      if (oneIn(10)) elements.insert(elements.end(), {7, nullptr, Array{"publish"}, "email"});
      options.permissions = elements;
    }
    return options;
  }

  model::Record record() {
    model::Record record{.granted = !oneIn(6), .hasOptions = !oneIn(12)};
    if (record.hasOptions) record.options = persistentOptions();
    if (!oneIn(8)) record.permissions = names();
    return record;
  }

  model::Request request() {
    using enum model::ServerSays;
    model::Request request;
    request.hasAllAccountsAccess = oneIn(20);
    request.hasDefaultAccess = oneIn(5);
    if (!oneIn(15)) request.bundleID = "org.example.random";
    request.accounts = oneIn(6) ? 0 : oneOf<int>({1, 1, 2});
    if (!oneIn(25)) request.options = options();
    if (oneIn(2)) request.record = record();
    request.requestsAreIgnored = oneIn(12);
    if (!oneIn(10)) request.responseWord = oneIn(3) ? oneOf<std::uintptr_t>({1, 2, 3, UINTPTR_MAX, 1UL << 32}) : 0;
    if (!oneIn(6)) request.description = oneOf<std::string>({R"("things")", R"("")", R"("API_EC_PARAM")", "{}", "7", "{"});
    request.serverSays = oneOf<model::ServerSays>(
        {tokenAndPermissions, tokenAndPermissions, tokenAndPermissions, tokenAlone, noToken, networkDown, nothing, noJson});
    request.serverGrants = names();
    return request;
  }

 private:
  std::mt19937_64 _engine;
  const std::vector<std::string> _common{"email", "user_likes", "publish"};
  const std::vector<Value> _audiences{FacebookAudienceEveryone, FacebookAudienceFriends, FacebookAudienceOnlyMe};
};

Dictionary dictionaryOf(const model::Options& options) {
  Dictionary dictionary;
  if (options.appID) dictionary.set(std::string(FacebookAppIdKey), *options.appID);
  if (options.permissions) dictionary.set(std::string(FacebookPermissionsKey), *options.permissions);
  if (options.audience) dictionary.set(std::string(FacebookAudienceKey), *options.audience);
  return dictionary;
}

RecordData recordOf(const model::Record& record) {
  RecordData data{.granted = record.granted};
  if (record.hasOptions) data.options = dictionaryOf(record.options);
  if (record.permissions) data.permissions = PermissionSet(record.permissions->begin(), record.permissions->end());
  return data;
}

ServerAnswer answerOf(const model::Request& request) {
  using enum model::ServerSays;
  switch (request.serverSays) {
    case tokenAndPermissions: return serverGrants(Array(request.serverGrants.begin(), request.serverGrants.end()));
    case tokenAlone: return {.data = R"({"access_token": "client token"})"};
    case noToken: return {.data = R"({"permissions": ["email"], "error_msg": "no"})"};
    case networkDown: return serverCannotBeReached();
    case noJson: return {.data = "{"};
    case nothing: break;
  }
  return {};
}

FakeClientData clientOf(const model::Request& request) {
  FakeClientData client{.id = "random", .bundleID = request.bundleID, .appName = "Random", .description = "random client"};
  if (request.hasAllAccountsAccess) client.entitlements.emplace_back(AllAccountsAccessEntitlement);
  if (request.hasDefaultAccess) client.entitlements.emplace_back(FacebookDefaultAccessEntitlement);
  return client;
}

std::string describeRequest(const model::Request& request) {
  const auto text = [](const std::optional<std::string>& value) { return value ? '"' + *value + '"' : std::string("none"); };
  std::string line = "all=" + std::to_string(request.hasAllAccountsAccess) +
                     " default=" + std::to_string(request.hasDefaultAccess) + " bundle=" + text(request.bundleID) +
                     " accounts=" + std::to_string(request.accounts) + " ignored=" + std::to_string(request.requestsAreIgnored);
  line += " options=" + (request.options ? compactJson(dictionaryOf(*request.options)) : "none");
  line += " record=" + (request.record ? ::testing::PrintToString(recordOf(*request.record)) : "none");
  line += " word=" + (request.responseWord ? std::to_string(*request.responseWord) : "none");
  return line + " description=" + text(request.description) + " server=" + answerOf(request).data.value_or("none");
}

// Thousands of requests do not wait for thousands of threads.
ServerAnswer atOnce(ServerAnswer answer) {
  answer.delivery = Delivery::inLine;
  return answer;
}

// The request carried out by the plug-in.
class Trial {
 public:
  explicit Trial(const model::Request& request) : _scene(clientOf(request)) {
    for (int number = 1; number <= request.accounts; ++number) _scene.addAccount("account" + std::to_string(number));
    if (request.record) _scene.addRecord(recordOf(*request.record));
    if (request.requestsAreIgnored) {
      _scene.platform.preferences.set(FacebookIgnoreAccessRequests, FacebookPreferencesAppID, true);
    }
    AlertAnswer answer;
    if (request.responseWord) answer.word = *request.responseWord;
    _scene.platform.alert.answers = {answer};
    _scene.platform.social.descriptionAnswers = {
        atOnce(request.description ? ServerAnswer{.data = *request.description} : serverCannotBeReached())};
    _scene.platform.social.authorizationAnswers = {atOnce(answerOf(request))};
    const auto options = request.options ? std::make_shared<const Dictionary>(dictionaryOf(*request.options))
                                         : std::shared_ptr<const Dictionary>();
    _answer = _scene.performHere([&](const AccessCompletion& completion) {
      _scene.plugin->handleAccessRequestToAccountsOfType(_scene.facebook, _scene.client, options, _scene.store, true,
                                                         completion);
    });
  }

  const CompletionCall& answer() const { return _answer; }

  std::optional<RecordData> record() const { return _scene.record(); }
  std::vector<std::string> consentSought() const { return consentAskedFor(trace()); }
  std::size_t alerts() const { return trace().named("SystemAlert.createAlert").size(); }
  std::vector<Event> serverRequests() const { return trace().named("FacebookAuthorizationRequest.init"); }
  bool tokenIsStored() const { return _scene.platform.keychain.entry("account1", "org.example.random") != nullptr; }

 private:
  const Trace& trace() const { return _scene.platform.trace; }

  Scene _scene;
  CompletionCall _answer;
};

std::string described(const Names& names) { return describe(PermissionSet(names.begin(), names.end())); }

void expectAsTheModelSays(const Trial& trial, const model::Outcome& outcome) {
  EXPECT_EQ(trial.answer().granted, outcome.granted);
  EXPECT_EQ(trial.answer().error.has_value(), outcome.error.has_value());
  if (trial.answer().error && outcome.error) {
    EXPECT_EQ(trial.answer().error->domain, outcome.error->first);
    EXPECT_EQ(trial.answer().error->code, outcome.error->second);
  }
  EXPECT_EQ(trial.consentSought(),
            outcome.consentSought ? std::vector{described(*outcome.consentSought)} : std::vector<std::string>());
  EXPECT_EQ(trial.alerts(), outcome.alertShown ? 1U : 0U);

  const std::vector<Event> requests = trial.serverRequests();
  EXPECT_EQ(requests.size(), outcome.requestedFromServer ? 1U : 0U);
  if (requests.size() == 1 && outcome.requestedFromServer) {
    EXPECT_EQ(requests[0]["permissions"],
              tracedSet(Array(outcome.requestedFromServer->begin(), outcome.requestedFromServer->end())));
    EXPECT_EQ(requests[0]["audience"], outcome.serverAudience ? Value(*outcome.serverAudience) : Value());
  }
  EXPECT_EQ(trial.tokenIsStored(), outcome.tokenStored);
  EXPECT_EQ(trial.record(), outcome.record ? std::optional(recordOf(*outcome.record)) : std::nullopt);
}

constexpr int trialCount = 3000;

TEST(RandomRequests, EndAsTheModelSays) {
  Dice dice(20240229);
  int grants = 0;
  for (int number = 0; number < trialCount; ++number) {
    const model::Request request = dice.request();
    SCOPED_TRACE("request " + std::to_string(number) + ": " + describeRequest(request));
    const Trial trial(request);
    expectAsTheModelSays(trial, model::outcomeOf(request));
    if (::testing::Test::HasFailure()) return;
    grants += trial.answer().granted ? 1 : 0;
  }
  EXPECT_GT(grants, trialCount / 5) << "The dice reach too few grants to be worth throwing.";
  EXPECT_LT(grants, trialCount * 4 / 5);
}

// The promise, told without the model: whoever is granted access has an entitlement, an earlier grant or the user's consent.
TEST(RandomRequests, AreNeverGrantedWithoutConsentEntitlementOrAnEarlierGrant) {
  Dice dice(19700101);
  for (int number = 0; number < trialCount; ++number) {
    const model::Request request = dice.request();
    SCOPED_TRACE("request " + std::to_string(number) + ": " + describeRequest(request));
    const Trial trial(request);

    const bool isEntitled = request.hasAllAccountsAccess || request.hasDefaultAccess;
    const bool hadAGrant = request.record && request.record->granted;
    const bool consented = trial.alerts() == 1 && request.responseWord == std::uintptr_t{0};
    const auto recordBefore = request.record ? std::optional(recordOf(*request.record)) : std::nullopt;

    EXPECT_TRUE(!trial.answer().granted || isEntitled || hadAGrant || consented);
    if (trial.record() != recordBefore && trial.record() && trial.record()->granted) {
      EXPECT_TRUE(trial.answer().granted);
      EXPECT_TRUE(isEntitled || consented) << "An earlier grant alone never makes a new one.";
    }
    const bool wasRefused = request.record && !request.record->granted && !request.hasAllAccountsAccess;
    EXPECT_FALSE(trial.answer().granted && wasRefused);
    EXPECT_FALSE(trial.tokenIsStored() && !trial.answer().granted);
    if (::testing::Test::HasFailure()) return;
  }
}

}  // namespace
}  // namespace palisade
