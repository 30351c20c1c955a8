#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <poll.h>

#include <chrono>
#include <csignal>
#include <fstream>
#include <functional>
#include <map>
#include <sstream>

#include "Host/Accounts/StoredAccount.h"
#include "Host/Json/Json.h"
#include "Host/Keychain/VaultKeychain.h"
#include "Host/Preferences/TomlFile.h"
#include "Host/Social/FacebookServer.h"
#include "Host/Vantad/Outbox.h"
#include "Platform/AccountCredential.h"
#include "Tests/Host/OwnRoot.h"
#include "Tests/Host/Social/ListeningSocket.h"
#include "Tests/Host/Social/Loopback.h"
#include "Tests/Host/Social/Sandbox.h"

// The social daemon as a process of its own: attacks 18, 19 and 24.

using namespace palisade;
using namespace std::chrono_literals;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

namespace {

using SteadyClock = std::chrono::steady_clock;

constexpr const char* accountID = "the-account";

std::string contentOf(const std::filesystem::path& path) {
  std::ostringstream content;
  content << std::ifstream(path).rdbuf();
  return content.str();
}

bool becomesTrue(const std::function<bool()>& condition) {
  const auto deadline = SteadyClock::now() + 60s;
  while (!condition()) {
    if (SteadyClock::now() > deadline) return false;
    poll(nullptr, 0, 2);
  }
  return true;
}

class Vantad : public testing::Test {
 protected:
  Vantad() {
    VaultKeychain vault({.choice = KeychainChoice::vault, .path = state() / "vault.sqlite", .keyFile = state() / "vault.key"});
    const auto account = std::make_shared<StoredAccount>(accountID, "", "");
    account->setCredential(std::make_shared<AccountCredential>(sandbox.masterToken(), "", distantFuture));
    EXPECT_EQ(vault.setCredentialForAccount(account, std::nullopt), std::nullopt);
    configure();
  }

  const std::filesystem::path& state() const { return _state.path(); }
  std::filesystem::path log() const { return _log.path() / "log"; }

  void configure() {
    writeTomlFile(_configuration.path() / "server.toml", {{"address", sandbox.address()},
                                                          {"certificate_authorities", sandbox.authorities().string()},
                                                          {"limits", Dictionary{{"connect_seconds", 1}}}});
  }
  void removeConfiguration() { std::filesystem::remove(_configuration.path() / "server.toml"); }

  ChildProcess::Command command() const {
    return {.program = VANTAD_PROGRAM,
            .arguments = {"--state", state().string(), "--configuration", (_configuration.path() / "server.toml").string(),
                          "--keychain", "vault", "--log", "debug"},
            .log = log()};
  }

  std::string issueToken(const std::string& appID) {
    HttpClient http(sandbox.trusted());
    ServerConfiguration configuration;
    configuration.address = sandbox.address();
    const HttpRequest request =
        FacebookServer(configuration).authorization(appID, "org.example.App", nullptr, std::nullopt, sandbox.masterToken());
    const HttpAnswer answer = answerOf(ask(http, request));
    return *NlohmannJsonParser().parse(answer.body, JsonFragments::refused).value->dictionary()->find("access_token")->string();
  }

  bool isValid(const std::string& token) {
    HttpClient http(sandbox.trusted());
    return answerOf(ask(http, meRequest(sandbox, token))).statusCode == 200;
  }

  bool hasStarted(int times) {
    return becomesTrue([&] {
      const std::string text = contentOf(log());
      int starts = 0;
      for (std::size_t place = 0; (place = text.find("Serving", place)) != std::string::npos; ++place) ++starts;
      return starts == times;
    });
  }

  bool settlesEverything() {
    return becomesTrue([this] { return outbox.pending().empty(); });
  }

  Sandbox sandbox;

 private:
  TemporaryFolder _state;
  TemporaryFolder _configuration;
  TemporaryFolder _log;

 protected:
  Outbox outbox{{.path = state() / "outbox.sqlite"}};
};

TEST_F(Vantad, CarriesOutWhatItFindsWhenItStartsAndEndsWhenItIsTold) {
  const std::string token = issueToken("app");
  outbox.add(accountID, "app");
  ChildProcess vantad(command());
  ASSERT_TRUE(settlesEverything()) << contentOf(log());
  EXPECT_FALSE(isValid(token));
  vantad.signal(SIGTERM);
  EXPECT_EQ(vantad.wait(), 0);
}

TEST_F(Vantad, IsWokenWhenSomethingIsAdded) {
  ChildProcess vantad(command());
  for (int count = 0; count < 5; ++count) {
    const std::string token = issueToken("app");
    outbox.add(accountID, "app");
    ASSERT_TRUE(settlesEverything()) << contentOf(log());
    EXPECT_FALSE(isValid(token));
  }
}

TEST_F(Vantad, EndsAtOnceWhileTheServerIsSilent) {
  sandbox.arm({{"kind", "silent"}, {"times", "0"}});
  outbox.add(accountID, "app");
  ChildProcess vantad(command());
  ASSERT_TRUE(becomesTrue([this] { return sandbox.requests().size() == 1; })) << contentOf(log());
  vantad.signal(SIGINT);
  EXPECT_EQ(vantad.wait(), 0);
  EXPECT_EQ(outbox.pending().size(), 1U);
}

TEST_F(Vantad, RunsOnceForAStateFolder) {
  const std::string token = issueToken("app");
  outbox.add(accountID, "app");
  ChildProcess vantad(command());
  ASSERT_TRUE(settlesEverything()) << contentOf(log());
  ChildProcess second(command());
  EXPECT_EQ(second.wait(), 1);
  EXPECT_THAT(contentOf(log()), HasSubstr("Another vantad of this user"));
}

TEST_F(Vantad, StartsToWorkWhenAServerIsConfigured) {
  removeConfiguration();
  outbox.add(accountID, "app");
  ChildProcess vantad(command());
  ASSERT_TRUE(becomesTrue([this] { return outbox.pending().front().attempts == 1; })) << contentOf(log());
  EXPECT_THAT(outbox.pending().front().lastError.value_or(""), HasSubstr("No server is configured"));
  configure();
  EXPECT_TRUE(settlesEverything()) << contentOf(log());
}

TEST_F(Vantad, SaysWhatIsWrongWithItsConfiguration) {
  writeTomlFile(command().arguments[3], {{"adress", "https://127.0.0.1"}});
  ChildProcess vantad(command());
  EXPECT_TRUE(becomesTrue([this] { return contentOf(log()).find("\"adress\"") != std::string::npos; }));
}

TEST_F(Vantad, LeavesABusyServerAloneThroughARestart) {
  sandbox.arm({{"kind", "unavailable"}, {"retry_after", "3600"}});
  outbox.add(accountID, "app");
  {
    ChildProcess vantad(command());
    ASSERT_TRUE(becomesTrue([this] { return outbox.pending().front().isHeldByServer; })) << contentOf(log());
  }
  {
    ChildProcess vantad(command());
    ASSERT_TRUE(hasStarted(2));
    outbox.add(accountID, "another app");
    vantad.signal(SIGTERM);
    EXPECT_EQ(vantad.wait(), 0);
  }
  EXPECT_EQ(sandbox.requests().size(), 1U);
  outbox.postpone(outbox.pending().front().id, presentMoment().date, true, "The hour has passed.");
  ChildProcess vantad(command());
  EXPECT_TRUE(settlesEverything()) << contentOf(log());
}

// What is started after it, the sandbox and vantad, lives in the test's own network.
struct OwnNetwork {
  Loopback loopback;
};

class VantadOffline : protected OwnNetwork, public Vantad {};

TEST_F(VantadOffline, TriesAgainAsSoonAsTheNetworkIsBack) {
  if (ranWithItsOwnRoot()) return;
  ASSERT_TRUE(loopback.isOwn());
  loopback.lower();
  outbox.add(accountID, "app");
  ChildProcess vantad(command());
  // Each address that comes is a reason to try, and each failure makes the next pause longer.
  constexpr int failures = 4;
  for (int number = 1; number <= failures; ++number) {
    ASSERT_TRUE(becomesTrue([&] { return outbox.pending().front().attempts >= number; })) << contentOf(log());
    loopback.addAddress(number);
  }
  loopback.raise();
  ASSERT_TRUE(settlesEverything()) << contentOf(log());
  const auto seconds = (outbox.latest(1).front().settledAt.value() - outbox.latest(1).front().requested.date).count();
  EXPECT_LT(seconds, 20) << "without the news it would have waited longer than that";
}

TEST_F(Vantad, LosesNothingWhenItIsKilledAtAnyPoint) {
  constexpr int kills = 40;
  std::map<std::string, std::string> tokens;  // by app
  const auto add = [&](int number) {
    const std::string appID = "app " + std::to_string(number);
    tokens[appID] = issueToken(appID);
    outbox.add(accountID, appID);
  };

  const auto before = SteadyClock::now();
  add(0);
  {
    ChildProcess vantad(command());
    ASSERT_TRUE(settlesEverything()) << contentOf(log());
  }
  const auto whole = SteadyClock::now() - before;

  for (int kill = 1; kill <= kills; ++kill) {
    add(kill);
    ChildProcess vantad(command());
    poll(nullptr, 0, static_cast<int>(std::chrono::duration_cast<std::chrono::milliseconds>(whole).count() * kill / kills));
    vantad.kill();
    for (const Invalidation& entry : outbox.latest(1000)) {
      if (entry.state == InvalidationState::confirmed) {
        EXPECT_FALSE(isValid(tokens[entry.appID])) << entry.appID;
      }
      EXPECT_NE(entry.state, InvalidationState::refused) << entry.lastError.value_or("");
    }
  }
  ChildProcess vantad(command());
  ASSERT_TRUE(settlesEverything()) << contentOf(log());
  for (const auto& [appID, token] : tokens) EXPECT_FALSE(isValid(token)) << appID;
}

TEST_F(Vantad, IsDeafToTheEnvironment) {
  ListeningSocket trap;
  const std::filesystem::path keys = sandbox.folder() / "keys";
  ChildProcess::Command steered = command();
  steered.environment = {{"https_proxy", "http://" + trap.name()},
                         {"ALL_PROXY", "http://" + trap.name()},
                         {"SSLKEYLOGFILE", keys.string()},
                         {"SSL_CERT_FILE", "/dev/null"},
                         {"OPENSSL_CONF", "/dev/full"}};
  outbox.add(accountID, "app");
  ChildProcess vantad(steered);
  EXPECT_TRUE(settlesEverything()) << contentOf(log());
  EXPECT_FALSE(trap.hasVisitor());
  EXPECT_FALSE(std::filesystem::exists(keys));
}

TEST_F(Vantad, WritesNoTokenAnywhere) {
  const std::string token = issueToken("app");
  for (const char* fault : {"status", "redirect", "page", "types", "bomb", "garbage"}) sandbox.arm({{"kind", fault}});
  outbox.add(accountID, "app");
  for (int starts = 0; starts < 6; ++starts) {
    ChildProcess vantad(command());
    ASSERT_TRUE(hasStarted(starts + 1));
    ASSERT_TRUE(becomesTrue([&] { return outbox.latest(1).front().attempts > starts || outbox.pending().empty(); }));
    vantad.signal(SIGTERM);
    EXPECT_EQ(vantad.wait(), 0);
  }
  std::string written = contentOf(log());
  for (const auto& entry : std::filesystem::directory_iterator(state())) written += contentOf(entry.path());
  EXPECT_THAT(written, HasSubstr("app"));
  EXPECT_THAT(written, Not(HasSubstr(token)));
  EXPECT_THAT(written, Not(HasSubstr(sandbox.masterToken())));
}

TEST_F(Vantad, UsesTheKeychainThatAccountdUses) {
  ChildProcess::Command left = command();
  left.arguments = {"--state", state().string(), "--configuration", command().arguments[3]};
  const auto accountdConfiguration = std::filesystem::path(command().arguments[3]).parent_path() / "accountd.toml";
  writeTomlFile(accountdConfiguration, {{"keychain", "vault"}, {"plugins", "/elsewhere"}});
  outbox.add(accountID, "app");
  {
    ChildProcess vantad(left);
    EXPECT_TRUE(settlesEverything()) << contentOf(log());
  }
  EXPECT_EQ(outbox.latest(1).front().state, InvalidationState::confirmed);
  writeTomlFile(accountdConfiguration, {{"keychain", "drawer"}});
  ChildProcess vantad(left);
  EXPECT_EQ(vantad.wait(), 2);
  EXPECT_THAT(contentOf(log()), HasSubstr("\"drawer\""));
}

TEST(VantadsCommandLine, ExplainsItself) {
  ChildProcess vantad({.program = VANTAD_PROGRAM, .arguments = {"--help"}});
  EXPECT_THAT(vantad.readLine().value_or(""), HasSubstr("Usage: vantad"));
  EXPECT_EQ(vantad.wait(), 0);
}

class ABadOption : public testing::TestWithParam<std::vector<std::string>> {};

TEST_P(ABadOption, IsAnErrorThatNamesIt) {
  TemporaryFolder folder;
  ChildProcess vantad({.program = VANTAD_PROGRAM, .arguments = GetParam(), .log = folder.path() / "log"});
  EXPECT_EQ(vantad.wait(), 2);
  EXPECT_THAT(contentOf(folder.path() / "log"), HasSubstr(GetParam().back()));
}

INSTANTIATE_TEST_SUITE_P(Table, ABadOption,
                         testing::Values(std::vector<std::string>{"--frob"}, std::vector<std::string>{"--state"},
                                         std::vector<std::string>{"--keychain", "drawer"},
                                         std::vector<std::string>{"--log", "loud"}, std::vector<std::string>{"word"}));

}  // namespace
