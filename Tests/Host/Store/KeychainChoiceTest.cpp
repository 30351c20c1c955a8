#include "Host/Keychain/KeychainChoice.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "Host/Keychain/KeychainError.h"
#include "Host/Keychain/VaultKeychain.h"
#include "Tests/Host/Store/KeychainEntries.h"
#include "Tests/Host/Store/PrivateSession.h"

namespace palisade {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Optional;

class ChoosingTheKeychain : public testing::Test {
 protected:
  // A process that begins with this setting.
  void begin(KeychainChoice choice) {
    options.choice = choice;
    vault.reset();
    vault = std::make_unique<VaultKeychain>(options);
  }

  std::optional<Error> set(const std::string& token) {
    return vault->setCredentialForAccount(makeAccount("a", CredentialContent{.token = token}), "client");
  }

  std::optional<std::string> get() {
    const auto content = contentOf(vault->credentialForAccount(makeAccount("a"), "client"));
    return content ? content->token : std::nullopt;
  }

  PrivateSession session;
  const std::filesystem::path state = session.home() / "state";
  VaultOptions options{
      .path = state / "vault.sqlite", .keyFile = state / "vault.key", .serviceTimeLimit = std::chrono::seconds{3}};
  std::unique_ptr<VaultKeychain> vault;
};

constexpr const char* inService = "Secret Service";
constexpr const char* inFile = "file alone";

TEST_F(ChoosingTheKeychain, PutsHalfOfTheKeyIntoTheSecretServiceWhereThereIsOne) {
  session.startKeyring();
  begin(KeychainChoice::automatic);
  ASSERT_EQ(set("token"), std::nullopt);
  EXPECT_THAT(vault->description(), HasSubstr(inService));
}

TEST_F(ChoosingTheKeychain, WaitsForASecretServiceThatIsLocked) {
  session.startKeyring();
  session.lockKeyring();
  begin(KeychainChoice::automatic);
  const auto error = set("token");
  ASSERT_TRUE(error);
  EXPECT_EQ(error->code, KeychainErrorLocked);
}

TEST_F(ChoosingTheKeychain, WaitsForASecretServiceThatDoesNotAnswer) {
  session.startKeyring();
  session.freezeKeyring();
  begin(KeychainChoice::automatic);
  const auto error = set("token");
  ASSERT_TRUE(error);
  EXPECT_EQ(error->code, KeychainErrorTimeout);
}

TEST_F(ChoosingTheKeychain, TakesTheFileAloneWhereThereIsNoSecretService) {
  begin(KeychainChoice::automatic);
  ASSERT_EQ(set("token"), std::nullopt);
  EXPECT_THAT(vault->description(), HasSubstr(inFile));
}

TEST_F(ChoosingTheKeychain, TakesTheFileAloneWhereTheSecretServiceHasNoKeyring) {
  session.startKeyringWithoutPassword();
  begin(KeychainChoice::automatic);
  ASSERT_EQ(set("token"), std::nullopt);
  EXPECT_THAT(vault->description(), HasSubstr(inFile));
}

TEST_F(ChoosingTheKeychain, StaysWithTheSecretServiceWhenItIsMissingLater) {
  session.startKeyring();
  begin(KeychainChoice::automatic);
  ASSERT_EQ(set("token"), std::nullopt);
  session.killKeyring();
  begin(KeychainChoice::automatic);
  EXPECT_THROW(get(), KeychainError);
  EXPECT_TRUE(set("another"));
  EXPECT_THAT(vault->description(), HasSubstr(inService));
}

TEST_F(ChoosingTheKeychain, StaysWithTheFileWhenASecretServiceComesLater) {
  begin(KeychainChoice::automatic);
  ASSERT_EQ(set("token"), std::nullopt);
  session.startKeyring();
  begin(KeychainChoice::automatic);
  EXPECT_THAT(vault->tidy(), IsEmpty());
  ASSERT_EQ(set("another"), std::nullopt);
  EXPECT_THAT(vault->description(), HasSubstr(inFile));
}

TEST_F(ChoosingTheKeychain, SealsEverythingAnewWhenTheSecretServiceIsAskedFor) {
  begin(KeychainChoice::vault);
  ASSERT_EQ(set("token"), std::nullopt);
  session.startKeyring();
  begin(KeychainChoice::secretService);
  EXPECT_THAT(vault->tidy(), ElementsAre(HasSubstr("new key")));
  begin(KeychainChoice::secretService);
  EXPECT_EQ(get(), "token");
  session.killKeyring();
  begin(KeychainChoice::secretService);
  EXPECT_THROW(get(), KeychainError);
}

TEST_F(ChoosingTheKeychain, SealsEverythingAnewWhenTheFileAloneIsAskedFor) {
  session.startKeyring();
  begin(KeychainChoice::secretService);
  ASSERT_EQ(set("token"), std::nullopt);
  begin(KeychainChoice::vault);
  EXPECT_THAT(vault->tidy(), ElementsAre(HasSubstr("new key")));
  session.killKeyring();
  begin(KeychainChoice::vault);
  EXPECT_EQ(get(), "token");
}

TEST_F(ChoosingTheKeychain, DoesNotLookForAServiceThatWasRuledOut) {
  begin(KeychainChoice::vault);
  session.startKeyring();
  session.freezeKeyring();
  EXPECT_THAT(vault->tidy(), IsEmpty());
  EXPECT_EQ(set("token"), std::nullopt);
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
