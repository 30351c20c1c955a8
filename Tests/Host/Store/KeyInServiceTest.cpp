// A vault with half of its key in a real keyring daemon: what that daemon can be told, and what it can become.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <functional>
#include <thread>

#include "Host/Keychain/KeychainError.h"
#include "Host/Keychain/SecretServiceHalves.h"
#include "Host/Keychain/VaultKeychain.h"
#include "Host/Sqlite/Statement.h"
#include "Tests/Host/Store/KeychainEntries.h"
#include "Tests/Host/Store/PrivateSession.h"
#include "Tests/Host/Store/StoreFiles.h"

namespace palisade {
namespace {

using testing::AllOf;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::Optional;

constexpr const char* busCanary = "EAABcanaryTokenThatIsForItsApplicationAlone";

class AKeyInTheService : public testing::Test {
 protected:
  void restart() {
    vault.reset();
    vault = std::make_unique<VaultKeychain>(options);
  }

  // A vault that holds a token, in a process that has not opened it yet.
  void beginWithToken(const std::string& token = "token") {
    session.startKeyring();
    restart();
    ASSERT_EQ(set("client", token), std::nullopt);
    restart();
  }

  std::optional<Error> set(const std::string& client, const std::string& token) {
    return vault->setCredentialForAccount(makeAccount("a", CredentialContent{.token = token}), client);
  }

  std::optional<std::string> get(const std::string& client) {
    const auto content = contentOf(vault->credentialForAccount(makeAccount("a"), client));
    return content ? content->token : std::nullopt;
  }

  // What the operation fails with, which has to be within seconds.
  static std::optional<Error> failureOf(const std::function<std::optional<Error>()>& operation) {
    const auto start = std::chrono::steady_clock::now();
    std::optional<Error> error;
    try {
      error = operation();
    } catch (const KeychainError& thrown) {
      error = thrown.error();
    }
    EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds{10});
    return error;
  }

  // Reading and storing fail with this code and say what to do, and a person is told the same.
  void expectNoUse(KeychainErrorCode code, const std::string& advice) {
    for (const auto& operation : std::vector<std::function<std::optional<Error>()>>{[&] { return get("client"), std::nullopt; },
                                                                                    [&] { return set("client", "new"); }}) {
      const std::optional<Error> error = failureOf(operation);
      ASSERT_TRUE(error) << "it succeeded";
      EXPECT_EQ(error->code, code) << *error->description;
      EXPECT_THAT(error->description, Optional(HasSubstr(advice)));
    }
    EXPECT_THAT(vault->trouble(), Optional(HasSubstr(advice)));
  }

  std::string everythingInTheService() {
    return session.run({"secret-tool", "search", "--all", "--unlock", "service", "com.veltran.Accounts1"});
  }

  std::string keyID() {
    constexpr std::string_view before = "attribute.key = ";
    const std::string found = everythingInTheService();
    const std::size_t place = found.find(before);
    return place == std::string::npos ? "" : found.substr(place + before.size(), 32);
  }

  // As another application does.
  void removeHalf() { session.run({"secret-tool", "clear", "service", "com.veltran.Accounts1"}); }
  void storeAsEarlierVersion(const std::string& attributes) {
    session.run({"sh", "-c", "printf %s " + std::string(busCanary) + " | secret-tool store --label=old " + attributes});
  }

  PrivateSession session;
  const std::filesystem::path state = session.home() / "state";
  VaultOptions options{.choice = KeychainChoice::secretService,
                       .path = state / "vault.sqlite",
                       .keyFile = state / "vault.key",
                       .serviceTimeLimit = std::chrono::seconds{3}};
  std::unique_ptr<VaultKeychain> vault;
  SecretServiceHalves others{std::chrono::seconds{3}};
};

TEST_F(AKeyInTheService, IsOneItemThatSaysToPeopleWhatItIs) {
  beginWithToken();
  ASSERT_EQ(set("another", "token"), std::nullopt);
  const std::string found = everythingInTheService();
  EXPECT_THAT(found, HasSubstr("label = Palisade: half of the key to the accounts' tokens"));
  EXPECT_EQ(found.find("label = "), found.rfind("label = ")) << found;
}

TEST_F(AKeyInTheService, LeavesNoTokenInTheServiceNorInAnyFile) {
  beginWithToken(busCanary);
  EXPECT_THAT(everythingInTheService(), AllOf(HasSubstr("secret = "), Not(HasSubstr(busCanary))));
  EXPECT_THAT(filesHolding(busCanary, session.home()), IsEmpty());
}

TEST_F(AKeyInTheService, CrossesTheBusEncrypted) {
  session.startKeyring();
  session.record();
  restart();
  ASSERT_EQ(set("client", busCanary), std::nullopt);
  restart();
  EXPECT_EQ(get("client"), busCanary);
  // When this call is in the recording, so is everything before it.
  while (session.recording().find("the.end.of.the.Recording") == std::string::npos) {
    session.run({"dbus-send", "--session", "--type=signal", "/", "the.end.of.the.Recording.IsHere"});
  }
  const std::string recording = session.recording();
  EXPECT_THAT(recording, AllOf(HasSubstr("CreateItem"), HasSubstr("GetSecret"))) << "the recording is of this conversation";
  EXPECT_THAT(recording, Not(HasSubstr(busCanary)));
  others.offer(keyID(), [&](const KeyHalf& half) {
    half.withHexadecimal([&](std::string_view digits) { EXPECT_THAT(recording, Not(HasSubstr(std::string(digits)))); });
    return true;
  });
}

TEST_F(AKeyInTheService, IsNotReplacedByTheFileAlone) {
  beginWithToken();
  vault.reset();
  constexpr std::array<std::string_view, 1> anyMigration{""};
  Database::open({.path = options.path, .applicationID = 0x506c5662, .migrations = anyMigration})
      ->execute("tamper", "UPDATE keys SET has_half_in_service = 0");
  restart();
  EXPECT_THROW(get("client"), KeychainError);
}

TEST_F(AKeyInTheService, ThatIsMissingSaysSo) {
  beginWithToken();
  session.killKeyring();
  expectNoUse(KeychainErrorUnavailable, "Secret Service");
  session.startKeyring();
  EXPECT_EQ(get("client"), "token");
}

TEST_F(AKeyInTheService, ThatIsLockedSaysSo) {
  beginWithToken();
  session.lockKeyring();
  expectNoUse(KeychainErrorLocked, "unlock it");
}

TEST_F(AKeyInTheService, ThatIsLockedIsNotTakenForLost) {
  beginWithToken();
  removeHalf();
  session.lockKeyring();
  expectNoUse(KeychainErrorLocked, "unlock it");
}

TEST_F(AKeyInTheService, ThatDoesNotAnswerIsGivenUp) {
  beginWithToken();
  session.freezeKeyring();
  expectNoUse(KeychainErrorTimeout, "did not answer in time");
  session.thawKeyring();
  EXPECT_EQ(get("client"), "token") << "it answers again";
}

TEST_F(AKeyInTheService, ThatDoesNotAnswerHoldsUpNobodyForLong) {
  beginWithToken();
  session.freezeKeyring();
  const auto start = std::chrono::steady_clock::now();
  {
    std::vector<std::jthread> threads;
    for (int thread = 0; thread < 5; ++thread) threads.emplace_back([&] { EXPECT_THROW(get("client"), KeychainError); });
  }
  EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds{10}) << "five waits of three seconds are too long";
}

TEST_F(AKeyInTheService, WhoseBusVanishesSaysSo) {
  beginWithToken();
  session.endBus();
  expectNoUse(KeychainErrorUnavailable, "Secret Service");
}

TEST_F(AKeyInTheService, WithoutAKeyringCannotBeMade) {
  session.startKeyringWithoutPassword();
  restart();
  const std::optional<Error> error = failureOf([&] { return set("client", "token"); });
  ASSERT_TRUE(error);
  EXPECT_EQ(error->code, KeychainErrorUnavailable);
  EXPECT_THAT(error->description, Optional(HasSubstr("no default keyring")));
}

TEST_F(AKeyInTheService, IsNotGivenToOneThatOffersOnlyPlainSessions) {
  session.startService({"/usr/bin/python3", "-m", "dbusmock", "--session", "org.freedesktop.secrets",
                        "/org/freedesktop/secrets", "org.freedesktop.Secret.Service"},
                       "org.freedesktop.secrets");
  session.run({"dbus-send", "--session", "--print-reply", "--dest=org.freedesktop.secrets", "/org/freedesktop/secrets",
               "org.freedesktop.DBus.Mock.AddMethod", "string:org.freedesktop.Secret.Service", "string:OpenSession",
               "string:sv", "string:vo",
               "string:if args[0] != 'plain': raise dbus.exceptions.DBusException('only plain', "
               "name='org.freedesktop.DBus.Error.NotSupported')\n"
               "ret = (dbus.String('', variant_level=1), dbus.ObjectPath('/org/freedesktop/secrets/session/1'))"});
  restart();
  const std::optional<Error> error = failureOf([&] { return set("client", "token"); });
  ASSERT_TRUE(error);
  EXPECT_THAT(error->description, Optional(HasSubstr("unencrypted")));
}

TEST_F(AKeyInTheService, ThatWasReplacedOpensNothing) {
  beginWithToken();
  const std::string id = keyID();
  removeHalf();
  others.add(id, KeyHalf::random());
  try {
    get("client");
    ADD_FAILURE() << "it was read";
  } catch (const KeychainError& error) {
    EXPECT_EQ(error.code(), KeychainErrorKeyLost);
    EXPECT_THAT(error.what(), AllOf(HasSubstr("replaced"), HasSubstr("sign in again")));
  }
}

TEST_F(AKeyInTheService, IsFoundAmongOthersThatLookLikeIt) {
  beginWithToken();
  const std::string id = keyID();
  for (int other = 0; other < 20; ++other) others.add(id, KeyHalf::random());
  EXPECT_EQ(get("client"), "token");
}

TEST_F(AKeyInTheService, ThatIsGoneLeavesWhatItHasSealedAndTheWayToStoreAnew) {
  beginWithToken("old");
  const std::string id = keyID();
  KeyHalf kept;
  others.offer(id, [&](const KeyHalf& half) {
    std::copy_n(half.bytes(), KeyHalf::size, kept.bytes());
    return true;
  });
  removeHalf();
  EXPECT_THAT(vault->trouble(), Optional(HasSubstr("sign in again")));
  ASSERT_EQ(set("new client", "new"), std::nullopt);
  EXPECT_EQ(get("new client"), "new");
  EXPECT_THROW(get("client"), KeychainError);
  EXPECT_NE(keyID(), id) << "nothing is written where the lost half may come back";

  others.add(id, kept);
  restart();
  EXPECT_EQ(get("client"), "old");
  EXPECT_EQ(get("new client"), "new");
  EXPECT_EQ(vault->trouble(), std::nullopt);
}

TEST_F(AKeyInTheService, StaysInTheProcessThatHasOpenedTheVaultWhenTheKeyringIsLocked) {
  beginWithToken();
  EXPECT_EQ(get("client"), "token");
  session.lockKeyring();
  EXPECT_EQ(get("client"), "token");
  EXPECT_THAT(vault->trouble(), Optional(HasSubstr("unlock it"))) << "the next start will need it";
}

TEST_F(AKeyInTheService, ThatWasReplacedInBetweenIsSpokenToAnew) {
  beginWithToken();
  session.killKeyring();
  session.startKeyring();
  EXPECT_EQ(get("client"), "token");
}

TEST_F(AKeyInTheService, MayBeAskedForByManyThreads) {
  beginWithToken();
  std::vector<std::jthread> threads;
  for (int thread = 0; thread < 4; ++thread) {
    threads.emplace_back([&, client = "client" + std::to_string(thread)] {
      EXPECT_EQ(get("client"), "token");
      EXPECT_EQ(set(client, client), std::nullopt);
      EXPECT_EQ(get(client), client);
    });
  }
  threads.clear();
  EXPECT_THAT(vault->clientIDsWithCredentials(makeAccount("a")),
              ElementsAre("client", "client0", "client1", "client2", "client3"));
}

TEST_F(AKeyInTheService, IsMadeOnceByManyThreads) {
  session.startKeyring();
  restart();
  std::vector<std::jthread> threads;
  for (int thread = 0; thread < 4; ++thread) {
    threads.emplace_back([&, client = "client" + std::to_string(thread)] { EXPECT_EQ(set(client, client), std::nullopt); });
  }
  threads.clear();
  restart();
  for (const char* client : {"client0", "client1", "client2", "client3"}) EXPECT_EQ(get(client), client);
}

TEST_F(AKeyInTheService, TakesThePlaceOfTheCredentialsThatWereKeptThere) {
  session.startKeyring();
  storeAsEarlierVersion("xdg:schema com.veltran.Accounts1.Credential service com.veltran.Accounts1 account a kind account");
  storeAsEarlierVersion("xdg:schema org.example.Other service com.veltran.Accounts1 account b");
  ASSERT_THAT(everythingInTheService(), HasSubstr("attribute.account = a"));
  restart();
  EXPECT_THAT(vault->tidy(), ElementsAre(AllOf(HasSubstr("have been removed (1)"), HasSubstr("Sign in again"))));
  EXPECT_THAT(everythingInTheService(), AllOf(Not(HasSubstr("attribute.account = a")), HasSubstr("attribute.account = b")));
  EXPECT_THAT(vault->tidy(), IsEmpty());
}

}  // namespace
}  // namespace palisade
