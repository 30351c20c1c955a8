#include "Host/Keychain/OpenKeychain.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fstream>

#include "Host/Keychain/KeychainError.h"
#include "Tests/Host/Store/KeychainEntries.h"
#include "Tests/Host/Store/PrivateSession.h"
#include "Tests/Host/Store/StoreFiles.h"

namespace palisade {
namespace {

using testing::HasSubstr;
using testing::Optional;

class OpeningTheKeychain : public testing::Test {
 protected:
  std::string descriptionOf(KeychainChoice choice) {
    options.choice = choice;
    return openKeychain(options)->description();
  }

  PrivateSession session;
  const std::filesystem::path state = session.home() / "state";
  KeychainOptions options{.vault = {.path = state / "vault.sqlite", .keyFile = state / "vault.key"},
                          .choiceFile = state / "keychain"};
};

constexpr const char* secretService = "Secret Service";
constexpr const char* vault = "vault";

TEST_F(OpeningTheKeychain, TakesTheSecretServiceWhereThereIsOne) {
  session.startKeyring();
  EXPECT_THAT(descriptionOf(KeychainChoice::automatic), HasSubstr(secretService));
  EXPECT_FALSE(std::filesystem::exists(options.vault.path)) << "and makes no vault";
}

TEST_F(OpeningTheKeychain, TakesTheSecretServiceWhereItIsLocked) {
  session.startKeyring();
  session.lockKeyring();
  EXPECT_THAT(descriptionOf(KeychainChoice::automatic), HasSubstr(secretService));
}

TEST_F(OpeningTheKeychain, TakesTheVaultWhereThereIsNoSecretService) {
  EXPECT_THAT(descriptionOf(KeychainChoice::automatic), HasSubstr(vault));
}

TEST_F(OpeningTheKeychain, TakesTheVaultWhereTheSecretServiceHasNoKeyring) {
  session.startKeyringWithoutPassword();
  EXPECT_THAT(descriptionOf(KeychainChoice::automatic), HasSubstr(vault));
}

TEST_F(OpeningTheKeychain, StaysWithTheSecretServiceWhenItIsMissingLater) {
  session.startKeyring();
  descriptionOf(KeychainChoice::automatic);
  session.killKeyring();
  EXPECT_THAT(descriptionOf(KeychainChoice::automatic), HasSubstr(secretService));
  EXPECT_THROW(openKeychain(options)->credentialForAccount(makeAccount("a"), "client"), KeychainError);
  EXPECT_FALSE(std::filesystem::exists(options.vault.path));
}

TEST_F(OpeningTheKeychain, StaysWithTheVaultWhenASecretServiceComesLater) {
  descriptionOf(KeychainChoice::automatic);
  session.startKeyring();
  EXPECT_THAT(descriptionOf(KeychainChoice::automatic), HasSubstr(vault));
}

TEST_F(OpeningTheKeychain, ObeysAChoiceThatWasSet) {
  EXPECT_THAT(descriptionOf(KeychainChoice::secretService), HasSubstr(secretService));
  session.startKeyring();
  EXPECT_THAT(descriptionOf(KeychainChoice::vault), HasSubstr(vault));
  EXPECT_FALSE(std::filesystem::exists(options.choiceFile)) << "only the automatic choice is written down";
}

TEST_F(OpeningTheKeychain, RefusesAnEarlierChoiceThatItCannotRead) {
  std::filesystem::create_directories(state);
  std::ofstream(options.choiceFile) << "plain";
  EXPECT_THROW(descriptionOf(KeychainChoice::automatic), KeychainError);
}

TEST(TheChoiceOfAKeychain, HasNames) {
  for (const KeychainChoice choice : {KeychainChoice::automatic, KeychainChoice::secretService, KeychainChoice::vault}) {
    EXPECT_THAT(keychainChoiceNamed(nameOf(choice)), Optional(choice));
  }
  EXPECT_EQ(nameOf(KeychainChoice::secretService), "secret-service");
  EXPECT_EQ(keychainChoiceNamed("plain"), std::nullopt);
}

}  // namespace
}  // namespace palisade
