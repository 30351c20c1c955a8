#include "Host/Keychain/SecretServiceKeychain.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <functional>
#include <thread>

#include "Host/Keychain/KeychainError.h"
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

constexpr const char* busCanary = "EAABcanaryTokenThatMustNotCrossTheBus";

class TheSecretService : public testing::Test {
 protected:
  std::optional<Error> set(const std::string& account, const std::optional<std::string>& client,
                           const CredentialContent& content) {
    return keychain.setCredentialForAccount(makeAccount(account, content), client);
  }

  std::optional<CredentialContent> get(const std::string& account, const std::optional<std::string>& client) {
    return contentOf(keychain.credentialForAccount(makeAccount(account), client));
  }

  // What the operation fails with, which has to be within seconds.
  std::optional<Error> failureOf(const std::function<std::optional<Error>()>& operation) {
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

  // Every operation fails with this code and says what to do.
  void expectEveryOperationToFail(KeychainErrorCode code, const std::string& advice) {
    const auto account = makeAccount("a", CredentialContent{.token = "token"});
    const std::vector<std::function<std::optional<Error>()>> operations{
        [&] { return keychain.credentialForAccount(account, "client"), std::nullopt; },
        [&] { return keychain.clientIDsWithCredentials(account), std::nullopt; },
        [&] { return keychain.setCredentialForAccount(account, "client"); },
        [&] { return keychain.removeCredentialForAccount(account, "client"); }};
    for (const auto& operation : operations) {
      const std::optional<Error> error = failureOf(operation);
      ASSERT_TRUE(error) << "it succeeded";
      EXPECT_EQ(error->code, code) << *error->description;
      EXPECT_THAT(error->description, Optional(HasSubstr(advice)));
    }
  }

  PrivateSession session;
  SecretServiceKeychain keychain{std::chrono::seconds{3}};
};

TEST_F(TheSecretService, ShowsPeopleWhatItKeeps) {
  session.startKeyring();
  ASSERT_EQ(set("a", "org.example.Photos", {.token = "token"}), std::nullopt);
  ASSERT_EQ(set("a", std::nullopt, {.token = "master"}), std::nullopt);
  const std::string found = session.run({"secret-tool", "search", "--all", "service", "com.veltran.Accounts1"});
  EXPECT_THAT(found, AllOf(HasSubstr("label = Palisade: the credential of org.example.Photos for user of a"),
                           HasSubstr("attribute.account = a"), HasSubstr("attribute.kind = client"),
                           HasSubstr("attribute.client = org.example.Photos")));
  EXPECT_THAT(found,
              AllOf(HasSubstr("label = Palisade: the credential of account user of a"), HasSubstr("attribute.kind = account")));
}

TEST_F(TheSecretService, GetsNoTokenOverTheBusUnencrypted) {
  session.startKeyring();
  session.record();
  ASSERT_EQ(set("a", "client", {.token = busCanary}), std::nullopt);
  EXPECT_THAT(get("a", "client"), Optional(CredentialContent{.token = busCanary}));
  // When this call is in the recording, so is everything before it.
  while (session.recording().find("the.end.of.the.Recording") == std::string::npos) {
    session.run({"dbus-send", "--session", "--type=signal", "/", "the.end.of.the.Recording.IsHere"});
  }
  EXPECT_THAT(session.recording(), AllOf(HasSubstr("CreateItem"), HasSubstr("GetSecrets"), HasSubstr("user of a")))
      << "the recording is of this conversation";
  EXPECT_THAT(session.recording(), Not(HasSubstr(busCanary)));
  EXPECT_THAT(filesHolding(busCanary, session.home()), IsEmpty());
}

TEST_F(TheSecretService, KeepsOneItemForEachCredential) {
  session.startKeyring();
  for (int round = 0; round < 3; ++round) set("a", "client", {.token = "token " + std::to_string(round)});
  const std::string found = session.run({"secret-tool", "search", "--all", "service", "com.veltran.Accounts1"});
  EXPECT_EQ(found.find("attribute.client"), found.rfind("attribute.client")) << found;
}

TEST_F(TheSecretService, MayBeUsedFromManyThreads) {
  session.startKeyring();
  std::vector<std::jthread> threads;
  for (int thread = 0; thread < 4; ++thread) {
    threads.emplace_back([&, thread] {
      const std::string client = "client" + std::to_string(thread);
      for (int round = 0; round < 5; ++round) {
        const CredentialContent credential{.token = client + " " + std::to_string(round)};
        EXPECT_EQ(set("a", client, credential), std::nullopt);
        EXPECT_THAT(get("a", client), Optional(credential));
      }
    });
  }
  threads.clear();
  EXPECT_THAT(keychain.clientIDsWithCredentials(makeAccount("a")), ElementsAre("client0", "client1", "client2", "client3"));
}

TEST_F(TheSecretService, ThatIsMissingSaysSo) {
  expectEveryOperationToFail(KeychainErrorUnavailable, "no Secret Service runs in this session");
  EXPECT_FALSE(keychain.isPresent());
}

TEST_F(TheSecretService, ThatIsLockedSaysSoAndKeepsWhatItHas) {
  session.startKeyring();
  ASSERT_EQ(set("a", "client", {.token = "token"}), std::nullopt);
  session.lockKeyring();
  expectEveryOperationToFail(KeychainErrorLocked, "unlock it");
  EXPECT_TRUE(keychain.isPresent()) << "it is there, and another keychain is no way out";
}

TEST_F(TheSecretService, ThatIsLockedDoesNotSayThatThereIsNothing) {
  session.startKeyring();
  session.lockKeyring();
  expectEveryOperationToFail(KeychainErrorLocked, "unlock it");
}

TEST_F(TheSecretService, WithoutAKeyringCannotStore) {
  session.startKeyringWithoutPassword();
  const std::optional<Error> error = failureOf([&] { return set("a", "client", {.token = "token"}); });
  ASSERT_TRUE(error);
  EXPECT_EQ(error->code, KeychainErrorUnavailable);
  EXPECT_THAT(error->description, Optional(HasSubstr("no default keyring")));
  EXPECT_FALSE(keychain.isPresent());
}

TEST_F(TheSecretService, ThatOffersOnlyPlainSessionsIsRefused) {
  session.startService({"/usr/bin/python3", "-m", "dbusmock", "--session", "org.freedesktop.secrets",
                        "/org/freedesktop/secrets", "org.freedesktop.Secret.Service"},
                       "org.freedesktop.secrets");
  session.run({"dbus-send", "--session", "--print-reply", "--dest=org.freedesktop.secrets", "/org/freedesktop/secrets",
               "org.freedesktop.DBus.Mock.AddMethod", "string:org.freedesktop.Secret.Service", "string:OpenSession",
               "string:sv", "string:vo",
               "string:if args[0] != 'plain': raise dbus.exceptions.DBusException('only plain', "
               "name='org.freedesktop.DBus.Error.NotSupported')\n"
               "ret = (dbus.String('', variant_level=1), dbus.ObjectPath('/org/freedesktop/secrets/session/1'))"});
  expectEveryOperationToFail(KeychainErrorUnavailable, "unencrypted");
  EXPECT_FALSE(keychain.isPresent());
}

TEST_F(TheSecretService, ThatDoesNotAnswerIsGivenUp) {
  session.startKeyring();
  ASSERT_EQ(set("a", "client", {.token = "token"}), std::nullopt);
  session.freezeKeyring();
  SecretServiceKeychain impatient(std::chrono::milliseconds{200});
  EXPECT_EQ(failureOf([&] { return set("a", "client", {.token = "new"}); })->code, KeychainErrorTimeout);
  EXPECT_FALSE(impatient.isPresent());
  session.thawKeyring();
  EXPECT_NO_THROW(get("a", "client")) << "it answers again";
}

TEST_F(TheSecretService, ThatDoesNotAnswerHoldsUpNobodyForLong) {
  session.startKeyring();
  ASSERT_EQ(set("a", "client", {.token = "token"}), std::nullopt);
  session.freezeKeyring();
  const auto start = std::chrono::steady_clock::now();
  {
    std::vector<std::jthread> threads;
    for (int thread = 0; thread < 5; ++thread) {
      threads.emplace_back([&] { EXPECT_THROW(get("a", "client"), KeychainError); });
    }
  }
  EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds{10}) << "five waits of three seconds are too long";
}

TEST_F(TheSecretService, ThatVanishesSaysSoAndIsFoundAgain) {
  session.startKeyring();
  ASSERT_EQ(set("a", "client", {.token = "token"}), std::nullopt);
  session.killKeyring();
  expectEveryOperationToFail(KeychainErrorUnavailable, "Secret Service");
  session.startKeyring();
  EXPECT_THAT(get("a", "client"), Optional(CredentialContent{.token = "token"}));
}

TEST_F(TheSecretService, ThatWasReplacedInBetweenIsSpokenToAnew) {
  session.startKeyring();
  ASSERT_EQ(set("a", "client", {.token = "token"}), std::nullopt);
  session.killKeyring();
  session.startKeyring();
  EXPECT_THAT(get("a", "client"), Optional(CredentialContent{.token = "token"}));
  EXPECT_EQ(set("a", "client", {.token = "new"}), std::nullopt);
}

TEST_F(TheSecretService, WhoseBusVanishesSaysSo) {
  session.startKeyring();
  ASSERT_EQ(set("a", "client", {.token = "token"}), std::nullopt);
  session.endBus();
  expectEveryOperationToFail(KeychainErrorUnavailable, "Secret Service");
}

}  // namespace
}  // namespace palisade
