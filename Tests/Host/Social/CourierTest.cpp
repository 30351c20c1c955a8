#include "Host/Vantad/Courier.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fstream>
#include <optional>
#include <semaphore>
#include <sstream>
#include <stdexcept>

#include "Host/Accounts/StoredAccount.h"
#include "Host/Json/Json.h"
#include "Host/Social/FacebookServer.h"
#include "Platform/AccountCredential.h"
#include "Platform/KeychainManager.h"
#include "Tests/Host/Social/RecordedLog.h"
#include "Tests/Host/Social/Sandbox.h"

// Attack 24: the server is down, or has better things to do, when access is taken back.

using namespace palisade;
using namespace std::chrono_literals;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

namespace {

// Holds the account's own token, or fails.
class OneTokenKeychain final : public KeychainManager {
 public:
  std::optional<std::string> token;
  bool isLocked = false;

  std::shared_ptr<const AccountCredential> credentialForAccount(const std::shared_ptr<Account>&,
                                                                const std::optional<std::string>& clientID) override {
    if (isLocked) throw std::runtime_error("The keychain is locked.");
    if (!token || clientID) return nullptr;
    return std::make_shared<AccountCredential>(token, "", distantFuture);
  }
  std::optional<Error> setCredentialForAccount(const std::shared_ptr<Account>&, const std::optional<std::string>&) override {
    return std::nullopt;
  }
  std::optional<Error> removeCredentialForAccount(const std::shared_ptr<Account>&, const std::optional<std::string>&) override {
    return std::nullopt;
  }
};

class ACourier : public testing::Test {
 protected:
  ACourier() { restart(); }

  // Everything that a new process would begin with.
  void restart() {
    courier.reset();
    http.reset();
    outbox.reset();
    outbox.emplace(OutboxOptions{.path = folder.path() / "outbox.sqlite", .clock = [this] { return now; }});
    http.emplace(configuration.httpOptions());
    courier.emplace(Courier::Parts{.outbox = *outbox,
                                   .http = *http,
                                   .server = server,
                                   .keychain = keychain,
                                   .json = json,
                                   .log = log,
                                   .account = [](const std::string& id) { return std::make_shared<StoredAccount>(id, "", ""); },
                                   .onAnswer = [this] { answered.release(); },
                                   .clock = [this] { return now; },
                                   .random = [] { return 0.0; }});
  }

  static ServerConfiguration configurationFor(const Sandbox& sandbox) {
    ServerConfiguration configuration;
    configuration.address = sandbox.address();
    configuration.certificateAuthorities = sandbox.authorities();
    return configuration;
  }

  // Lets it work until it has nothing to do; answers for how long.
  std::optional<std::chrono::seconds> work() {
    while (true) {
      const auto wait = courier->advance();
      if (wait) return std::chrono::duration_cast<std::chrono::seconds>(*wait);
      if (outbox->pending().empty()) return std::nullopt;
      answered.acquire();
    }
  }

  void pass(std::chrono::seconds time) { now.date += time; }

  // To the server too, which counts by a clock of its own, wishes grow old.
  void growOld(std::chrono::seconds time) { now.uptime += time; }

  std::string issueToken(const std::string& appID) {
    const HttpAnswer answer =
        answerOf(ask(*http, server.authorization(appID, "org.example.App", nullptr, std::nullopt, sandbox.masterToken())));
    return *json.parse(answer.body, JsonFragments::refused).value->dictionary()->find("access_token")->string();
  }

  bool isValid(const std::string& token) { return answerOf(ask(*http, meRequest(sandbox, token))).statusCode == 200; }

  Invalidation latest() { return outbox->latest(1).front(); }

  Sandbox sandbox;
  TemporaryFolder folder;
  ServerConfiguration configuration = configurationFor(sandbox);
  FacebookServer server{configuration};
  OneTokenKeychain keychain = [this] {
    OneTokenKeychain made;
    made.token = sandbox.masterToken();
    return made;
  }();
  NlohmannJsonParser json;
  RecordedLog log;
  Moment now = {.date = Date(1'700'000'000s), .boot = "a boot", .uptime = 1h};
  std::counting_semaphore<> answered{0};
  std::optional<Outbox> outbox;
  std::optional<HttpClient> http;
  std::optional<Courier> courier;
};

TEST_F(ACourier, HasNothingToDoWithAnEmptyOutbox) {
  EXPECT_EQ(work(), std::nullopt);
  EXPECT_THAT(sandbox.requests(), IsEmpty());
}

TEST_F(ACourier, InvalidatesTheTokensOfTheApp) {
  const std::string token = issueToken("app");
  const std::string other = issueToken("other app");
  outbox->add("account", "app");
  EXPECT_EQ(work(), std::nullopt);
  EXPECT_EQ(latest().state, InvalidationState::confirmed);
  EXPECT_FALSE(isValid(token));
  EXPECT_TRUE(isValid(other));
}

TEST_F(ACourier, IsContentWhenTheServerKnowsOfNoToken) {
  outbox->add("account", "app");
  EXPECT_EQ(work(), std::nullopt);
  EXPECT_EQ(latest().state, InvalidationState::confirmed);
}

TEST_F(ACourier, CarriesOutWhatWasAddedTwice) {
  const std::string token = issueToken("app");
  outbox->add("account", "app");
  outbox->add("account", "app");
  EXPECT_EQ(work(), std::nullopt);
  EXPECT_THAT(outbox->pending(), IsEmpty());
  EXPECT_FALSE(isValid(token));
}

TEST_F(ACourier, CarriesOutWhatTheServerDidBeforeItFellSilent) {
  const std::string token = issueToken("app");
  sandbox.arm({{"kind", "close"}, {"bytes", "30"}});
  outbox->add("account", "app");
  EXPECT_EQ(work(), 5s);
  EXPECT_FALSE(isValid(token));
  EXPECT_EQ(latest().state, InvalidationState::pending);
  pass(5s);
  EXPECT_EQ(work(), std::nullopt);
  EXPECT_EQ(latest().state, InvalidationState::confirmed);
}

TEST_F(ACourier, LeavesTheServerAloneForAsLongAsItAsks) {
  const std::string token = issueToken("app");
  sandbox.arm({{"kind", "unavailable"}, {"retry_after", "120"}});
  outbox->add("account", "app");
  EXPECT_EQ(work(), 120s);
  EXPECT_TRUE(isValid(token));
  const std::size_t asked = sandbox.requests().size();

  outbox->add("account", "another app");
  courier->hurry();
  pass(119s);
  EXPECT_EQ(work(), 1s);
  restart();
  EXPECT_EQ(work(), 1s);
  EXPECT_EQ(sandbox.requests().size(), asked);

  pass(1s);
  EXPECT_EQ(work(), std::nullopt);
  EXPECT_THAT(outbox->pending(), IsEmpty());
  EXPECT_FALSE(isValid(token));
}

TEST_F(ACourier, LeavesTheServerAloneUntilTheDateThatItGives) {
  sandbox.arm({{"kind", "unavailable"}, {"retry_after", "Fri, 31 Dec 9999 23:59:59 GMT"}});
  outbox->add("account", "app");
  EXPECT_EQ(work(), 24h) << "a day is the most";
}

TEST_F(ACourier, WaitsLongerAfterEachFailure) {
  sandbox.arm({{"kind", "status"}, {"status", "500"}, {"times", "0"}});
  outbox->add("account", "app");
  for (const auto pause : {5s, 10s, 20s, 40s}) {
    EXPECT_EQ(work(), pause);
    pass(pause);
  }
  sandbox.calm();
  EXPECT_EQ(work(), std::nullopt);
  EXPECT_EQ(latest().state, InvalidationState::confirmed);
  EXPECT_EQ(latest().attempts, 5);
}

TEST_F(ACourier, AsksAServerThatIsDownOnceForAllEntries) {
  sandbox.arm({{"kind", "status"}, {"status", "500"}, {"times", "0"}});
  for (int count = 0; count < 10; ++count) outbox->add("account", "app " + std::to_string(count));
  EXPECT_EQ(work(), 5s);
  EXPECT_EQ(sandbox.requests().size(), 1U);
}

TEST_F(ACourier, TriesAgainAtOnceWhenTheNetworkHasChanged) {
  sandbox.stop();
  outbox->add("account", "app");
  EXPECT_EQ(work(), 5s);
  EXPECT_EQ(work(), 5s) << "and not before";
  courier->hurry();
  EXPECT_EQ(work(), 10s);
  sandbox.restart();
  courier->hurry();
  EXPECT_EQ(work(), std::nullopt);
  EXPECT_EQ(latest().state, InvalidationState::confirmed);
  EXPECT_EQ(latest().attempts, 3);
}

TEST_F(ACourier, TriesAgainAtOnceWhenTheNetworkHasChangedDuringAnAttempt) {
  sandbox.stop();
  outbox->add("account", "app");
  EXPECT_EQ(courier->advance(), std::nullopt) << "an attempt is under way";
  courier->hurry();
  EXPECT_EQ(work(), 10s) << "the pause after a second attempt";
  EXPECT_EQ(latest().attempts, 2);
}

TEST_F(ACourier, TriesAgainAtOnceAfterARestart) {
  sandbox.stop();
  outbox->add("account", "app");
  EXPECT_EQ(work(), 5s);
  sandbox.restart();
  restart();
  EXPECT_EQ(work(), std::nullopt);
  EXPECT_EQ(latest().state, InvalidationState::confirmed);
}

TEST_F(ACourier, DoesNotWaitForAClockThatHasGoneBack) {
  sandbox.arm({{"kind", "unavailable"}, {"retry_after", "120"}});
  outbox->add("account", "app");
  EXPECT_EQ(work(), 120s);
  now.date -= 24h * 365 * 27;
  EXPECT_EQ(work(), std::nullopt);
  EXPECT_EQ(latest().state, InvalidationState::confirmed);
}

TEST_F(ACourier, SparesTokensThatWereIssuedAfterTheWish) {
  outbox->add("account", "app");
  const std::string token = issueToken("app");
  growOld(1h);
  EXPECT_EQ(work(), std::nullopt);
  EXPECT_EQ(latest().state, InvalidationState::confirmed);
  EXPECT_TRUE(isValid(token));
}

TEST_F(ACourier, SparesNoTokenWhenNobodyKnowsHowOldTheWishIs) {
  outbox->add("account", "app");
  const std::string token = issueToken("app");
  now.boot = "another boot";
  growOld(1h);
  EXPECT_EQ(work(), std::nullopt);
  EXPECT_FALSE(isValid(token));
}

TEST_F(ACourier, WaitsForAKeychainThatIsLocked) {
  const std::string token = issueToken("app");
  keychain.isLocked = true;
  outbox->add("account", "app");
  EXPECT_EQ(work(), 5s);
  EXPECT_EQ(latest().lastError, "The keychain is locked.");
  keychain.isLocked = false;
  pass(5s);
  EXPECT_EQ(work(), std::nullopt);
  EXPECT_FALSE(isValid(token));
}

TEST_F(ACourier, WaitsForATokenThatTheServerAccepts) {
  keychain.token = "an old token";
  outbox->add("account", "app");
  EXPECT_EQ(work(), 5s);
  EXPECT_THAT(latest().lastError.value_or(""), HasSubstr("401"));
  keychain.token = sandbox.masterToken();
  pass(5s);
  EXPECT_EQ(work(), std::nullopt);
  EXPECT_EQ(latest().state, InvalidationState::confirmed);
}

TEST_F(ACourier, GivesUpWhenTheAccountHasNoTokenAnyMore) {
  for (const auto& token : {std::optional<std::string>(), std::optional<std::string>("")}) {
    keychain.token = token;
    outbox->add("account", "app");
    EXPECT_EQ(work(), std::nullopt);
    EXPECT_EQ(latest().state, InvalidationState::refused);
  }
  EXPECT_THAT(sandbox.requests(), IsEmpty());
}

TEST_F(ACourier, GivesUpWhenTheServerRefuses) {
  sandbox.arm({{"kind", "status"}, {"status", "403"}});
  outbox->add("account", "app");
  EXPECT_EQ(work(), std::nullopt);
  EXPECT_EQ(latest().state, InvalidationState::refused);
  EXPECT_THAT(latest().lastError.value_or(""), HasSubstr("403"));
}

TEST_F(ACourier, TakesAWrongPathForNoConfirmation) {
  configuration.paths.invalidation = "/nowhere";
  server = FacebookServer(configuration);
  restart();
  outbox->add("account", "app");
  EXPECT_EQ(work(), 5s);
  EXPECT_THAT(latest().lastError.value_or(""), HasSubstr("paths.invalidation"));
}

TEST_F(ACourier, SaysThatNoServerIsConfigured) {
  server = FacebookServer(ServerConfiguration());
  restart();
  outbox->add("account", "app");
  EXPECT_EQ(work(), 5s);
  EXPECT_THAT(latest().lastError.value_or(""), HasSubstr("No server is configured"));
}

TEST_F(ACourier, LeavesAnEntryPendingThatItAbandons) {
  sandbox.arm({{"kind", "silent"}});
  outbox->add("account", "app");
  EXPECT_EQ(courier->advance(), std::nullopt);
  courier.reset();
  EXPECT_EQ(latest().state, InvalidationState::pending);
  EXPECT_EQ(latest().attempts, 0);
}

std::string contentOf(const std::filesystem::path& folder) {
  std::ostringstream content;
  for (const auto& entry : std::filesystem::directory_iterator(folder)) content << std::ifstream(entry.path()).rdbuf();
  return content.str();
}

// Attack 19.
TEST_F(ACourier, WritesNoTokenIntoTheOutboxOrTheLog) {
  const std::string token = issueToken("app");
  for (const char* fault : {"status", "redirect", "page", "reset", "bomb"}) {
    sandbox.arm({{"kind", fault}});
    outbox->add("account", "app");
    work();
    courier->hurry();
    work();
  }
  const std::string written = contentOf(folder.path()) + log.text();
  EXPECT_THAT(written, HasSubstr("app"));
  EXPECT_THAT(written, Not(HasSubstr(token)));
  EXPECT_THAT(written, Not(HasSubstr(sandbox.masterToken())));
}

}  // namespace
