#include "Host/Keychain/VaultKeychain.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <array>
#include <cerrno>
#include <fstream>

#include "Host/Keychain/KeychainError.h"
#include "Host/Sqlite/Statement.h"
#include "Tests/Host/OwnRoot.h"
#include "Tests/Host/Store/ChildProcess.h"
#include "Tests/Host/Store/DiskFaults.h"
#include "Tests/Host/Store/InMemory.h"
#include "Tests/Host/Store/KeychainEntries.h"
#include "Tests/Host/Store/StoreFiles.h"
#include "Tests/Host/Store/Unprivileged.h"
#include "Tests/Host/TemporaryFolder.h"

namespace palisade {
namespace {

using testing::AllOf;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::Optional;

constexpr const char* canary = "EAABcanaryTokenThatMustNotBeInAnyFile";

class AVault : InMemory, public testing::Test {
 protected:
  AVault() { restart(); }

  void restart() {
    vault.reset();
    vault = std::make_unique<VaultKeychain>(options);
  }

  std::optional<Error> set(const std::string& account, const std::optional<std::string>& client,
                           const CredentialContent& content) {
    return vault->setCredentialForAccount(makeAccount(account, content), client);
  }

  std::optional<CredentialContent> get(const std::string& account, const std::optional<std::string>& client) {
    return contentOf(vault->credentialForAccount(makeAccount(account), client));
  }

  // What opening the vault and reading from it fails with.
  KeychainError failure() {
    try {
      restart();
      get("a", "client");
    } catch (const KeychainError& error) {
      return error;
    }
    return {KeychainErrorForeignAccount, "it opened"};
  }

  // Changes the rows as somebody does who can write to the file and lacks the key.
  void tamper(const std::string& sql) {
    constexpr std::array<std::string_view, 1> anyMigration{""};
    vault.reset();
    Database::open({.path = options.path, .applicationID = 0x506c5662, .migrations = anyMigration})
        ->execute("tamper", sql.c_str());
    restart();
  }

  TemporaryFolder folder;
  VaultOptions options{.choice = KeychainChoice::vault,
                       .path = folder.path() / "state" / "vault.sqlite",
                       .keyFile = folder.path() / "state" / "vault.key"};
  std::unique_ptr<VaultKeychain> vault;
};

TEST_F(AVault, GivesBackAfterARestartWhatItWasGiven) {
  const CredentialContent credential{.token = "EAAB", .refreshToken = "r", .expiryDate = Date(std::chrono::seconds(17))};
  ASSERT_EQ(set("a", "client", credential), std::nullopt);
  restart();
  EXPECT_THAT(get("a", "client"), Optional(credential));
}

TEST_F(AVault, HasNoTokenInAnyFile) {
  set("a", std::nullopt, {.token = canary, .refreshToken = canary});
  set("a", "client", {.token = canary});
  EXPECT_THAT(filesHolding(canary, folder.path()), IsEmpty()) << "while it is open";
  vault.reset();
  EXPECT_THAT(filesHolding(canary, folder.path()), IsEmpty()) << "after it has been closed";
}

TEST_F(AVault, WritesTheSameTokenDifferentlyEachTime) {
  const auto sealed = [&] {
    vault.reset();
    constexpr std::array<std::string_view, 1> anyMigration{""};
    const auto database = Database::open({.path = options.path, .applicationID = 0x506c5662, .migrations = anyMigration});
    Statement read(*database, "read", "SELECT nonce || ciphertext FROM credentials");
    Statement::Run row = read.run();
    EXPECT_TRUE(row.next());
    return row.text(0);
  };
  set("a", "client", {.token = "same"});
  const std::string first = sealed();
  restart();
  set("a", "client", {.token = "same"});
  EXPECT_NE(sealed(), first);
}

TEST_F(AVault, KeepsItsKeyForItsOwnerAlone) {
  set("a", "client", {.token = "token"});
  struct stat status {};
  ASSERT_EQ(stat(options.keyFile.c_str(), &status), 0);
  EXPECT_EQ(status.st_mode & 07777, 0600U);
  EXPECT_EQ(status.st_size, 32);
  EXPECT_THAT(namesIn(options.keyFile.parent_path()), Not(testing::Contains(HasSubstr(".new"))));
}

struct Tampering {
  const char* name;
  const char* sql;
};

void PrintTo(const Tampering& tampering, std::ostream* stream) { *stream << tampering.name; }

class ATamperedVault : public AVault, public testing::WithParamInterface<Tampering> {};

TEST_P(ATamperedVault, IsRefused) {
  set("a", "victim", {.token = "token of the victim"});
  set("a", "thief", {.token = "token of the thief"});
  set("a", std::nullopt, {.token = "master token"});
  set("b", "victim", {.token = "token for another account"});
  tamper(GetParam().sql);
  try {
    get("a", "thief");
    ADD_FAILURE() << "it was read";
  } catch (const KeychainError& error) {
    EXPECT_EQ(error.code(), KeychainErrorTampered);
    EXPECT_THAT(error.what(), AllOf(HasSubstr("thief"), HasSubstr("tampered"), Not(HasSubstr("token of"))));
  }
}

// Copies the sealed text of one row into the thief's.
#define COPY_FROM(row)                                                                                 \
  "UPDATE credentials SET (nonce, ciphertext) = (SELECT nonce, ciphertext FROM credentials WHERE " row \
  ") WHERE client_id = "                                                                               \
  "'thief'"

INSTANTIATE_TEST_SUITE_P(
    Tamperings, ATamperedVault,
    testing::Values(
        Tampering{"byAnotherClientsToken", COPY_FROM("account_id = 'a' AND client_id = 'victim'")},
        Tampering{"byTheMasterToken", COPY_FROM("has_client = 0")},
        Tampering{"byAnotherAccountsToken", COPY_FROM("account_id = 'b'")},
        Tampering{"byAChangedByte", "UPDATE credentials SET ciphertext = CAST(x'00' || substr(ciphertext, 2) AS BLOB)"},
        Tampering{"byAShorterText", "UPDATE credentials SET ciphertext = substr(ciphertext, 1, length(ciphertext) - 1)"},
        Tampering{"byAnEmptyText", "UPDATE credentials SET ciphertext = x''"},
        Tampering{"byAnEmptyNonce", "UPDATE credentials SET nonce = x''"},
        Tampering{"byAnotherNonce", "UPDATE credentials SET nonce = randomblob(24)"}),
    [](const auto& each) { return each.param.name; });

#undef COPY_FROM

TEST_F(AVault, TellsAccountsAndClientsApartWhoseNamesRunTogether) {
  set("a", "bc", {.token = "token"});
  tamper("UPDATE credentials SET account_id = 'ab', client_id = 'c'");
  EXPECT_THROW(get("ab", "c"), KeychainError);
}

TEST_F(AVault, DoesNotOpenWithAnotherKey) {
  set("a", "client", {.token = "token"});
  overwrite(options.keyFile, 0, "another key another key another!");
  const KeychainError error = failure();
  EXPECT_EQ(error.code(), KeychainErrorKeyLost);
  EXPECT_THAT(error.what(), AllOf(HasSubstr("another key"), HasSubstr("sign in again")));
}

TEST_F(AVault, DoesNotReplaceAKeyThatIsMissing) {
  set("a", "client", {.token = "token"});
  std::filesystem::rename(options.keyFile, folder.path() / "saved");
  const KeychainError error = failure();
  EXPECT_EQ(error.code(), KeychainErrorKeyLost);
  EXPECT_THAT(error.what(), AllOf(HasSubstr(options.keyFile.string()), HasSubstr("missing")));
  EXPECT_FALSE(std::filesystem::exists(options.keyFile));

  std::filesystem::rename(folder.path() / "saved", options.keyFile);
  restart();
  EXPECT_THAT(get("a", "client"), Optional(CredentialContent{.token = "token"}));
}

TEST_F(AVault, WhoseKeyIsLostStoresUnderAnotherKeyAndDestroysNothing) {
  set("a", "old", {.token = "old"});
  std::filesystem::rename(options.keyFile, folder.path() / "saved");
  restart();
  EXPECT_NE(vault->trouble(), std::nullopt);
  ASSERT_EQ(set("a", "new", {.token = "new"}), std::nullopt);
  EXPECT_FALSE(std::filesystem::exists(options.keyFile)) << "the name is the lost key's";
  EXPECT_THROW(get("a", "old"), KeychainError);

  std::filesystem::rename(folder.path() / "saved", options.keyFile);
  restart();
  EXPECT_THAT(get("a", "old"), Optional(CredentialContent{.token = "old"}));
  EXPECT_THAT(get("a", "new"), Optional(CredentialContent{.token = "new"}));
  EXPECT_EQ(vault->trouble(), std::nullopt);
}

TEST_F(AVault, WhoseKeyIsLostGivesUpWhatIsRemoved) {
  set("a", "client", {.token = "token"});
  std::filesystem::remove(options.keyFile);
  restart();
  EXPECT_THAT(vault->clientIDsWithCredentials(makeAccount("a")), ElementsAre("client"));
  EXPECT_EQ(vault->removeCredentialForAccount(makeAccount("a"), "client"), std::nullopt);
  EXPECT_EQ(get("a", "client"), std::nullopt);
}

TEST_F(AVault, DoesNotOpenWithoutTheHalfThatItsRowDenies) {
  set("a", "client", {.token = "token"});
  tamper("UPDATE keys SET id = 'another'");
  EXPECT_EQ(failure().code(), KeychainErrorKeyLost);
}

class AKeyFileWithRights : public AVault, public testing::WithParamInterface<mode_t> {};

TEST_P(AKeyFileWithRights, ForOthersIsRefused) {
  set("a", "client", {.token = "token"});
  ASSERT_EQ(chmod(options.keyFile.c_str(), GetParam()), 0);
  const KeychainError error = failure();
  EXPECT_EQ(error.code(), KeychainErrorKey);
  EXPECT_THAT(error.what(), AllOf(HasSubstr(options.keyFile.string()), HasSubstr("chmod 600")));
  EXPECT_TRUE(set("a", "client", {.token = "another"})) << "and gets no other key";
}

INSTANTIATE_TEST_SUITE_P(Rights, AKeyFileWithRights, testing::Values(0640, 0604, 0620, 0602, 0666, 0610));

TEST_F(AVault, RefusesAKeyFileOfAnotherUser) {
  if (ranWithItsOwnRoot()) return;
  set("a", "client", {.token = "token"});
  ASSERT_EQ(chown(options.keyFile.c_str(), 65534, 65534), 0);
  EXPECT_THAT(failure().what(), HasSubstr("another user"));
}

TEST_F(AVault, RefusesAKeyFileThatIsALink) {
  set("a", "client", {.token = "token"});
  std::filesystem::rename(options.keyFile, folder.path() / "elsewhere");
  std::filesystem::create_symlink(folder.path() / "elsewhere", options.keyFile);
  EXPECT_EQ(failure().code(), KeychainErrorKey);
}

TEST_F(AVault, RefusesAKeyFileOfAnotherSize) {
  set("a", "client", {.token = "token"});
  for (const std::size_t size : {0U, 31U, 33U}) {
    std::filesystem::resize_file(options.keyFile, size);
    EXPECT_THAT(failure().what(), HasSubstr(std::to_string(size) + " bytes"));
  }
}

class AVaultWithACredential : public AVault {
 protected:
  AVaultWithACredential() {
    options.path = folder.path() / "other" / "vault.sqlite";
    options.keyFile = folder.path() / "other" / "vault.key";
    options.credentialsFolder = folder.path() / "credentials";
    std::filesystem::create_directory(*options.credentialsFolder);
  }

  void giveKey(const std::string& key, mode_t rights) {
    const std::filesystem::path file = *options.credentialsFolder / "keychain.key";
    std::ofstream(file) << key;
    ASSERT_EQ(chmod(file.c_str(), rights), 0);
  }
};

TEST_F(AVaultWithACredential, TakesTheKeyThatTheServiceManagerHands) {
  giveKey("0123456789abcdef0123456789abcdef", 0440);
  restart();
  set("a", "client", {.token = "token"});
  EXPECT_FALSE(std::filesystem::exists(options.keyFile));
  restart();
  EXPECT_THAT(get("a", "client"), Optional(CredentialContent{.token = "token"}));
}

TEST_F(AVaultWithACredential, MakesItsOwnKeyWhenNoneIsHanded) {
  restart();
  set("a", "client", {.token = "token"});
  EXPECT_TRUE(std::filesystem::exists(options.keyFile));
}

TEST_F(AVaultWithACredential, RefusesOneThatEverybodyMayRead) {
  giveKey("0123456789abcdef0123456789abcdef", 0444);
  restart();
  const std::optional<Error> error = set("a", "client", {.token = "token"});
  ASSERT_TRUE(error);
  EXPECT_EQ(error->code, KeychainErrorKey);
  EXPECT_FALSE(std::filesystem::exists(options.keyFile)) << "and does not go on with a key of its own";
}

TEST_F(AVaultWithACredential, DoesNotOpenWhenItIsHandedNoLonger) {
  giveKey("0123456789abcdef0123456789abcdef", 0440);
  restart();
  set("a", "client", {.token = "token"});
  std::filesystem::remove(*options.credentialsFolder / "keychain.key");
  EXPECT_THAT(failure().what(), HasSubstr("missing"));
}

TEST_F(AVaultWithACredential, StillOpensWhatItsOwnKeyHasSealed) {
  restart();
  set("a", "client", {.token = "token"});
  giveKey("0123456789abcdef0123456789abcdef", 0440);
  restart();
  EXPECT_THAT(get("a", "client"), Optional(CredentialContent{.token = "token"}));
}

TEST_F(AVault, OpenedFirstByTwoProcessesHasOneKey) {
  for (int round = 0; round < 10; ++round) {
    vault.reset();
    std::filesystem::remove_all(options.path.parent_path());
    const auto storeOne = [&](const std::string& client) {
      return [&, client](const ChildProcess::Acknowledge&) {
        restart();
        if (const auto error = set("a", client, {.token = client})) throw std::runtime_error(*error->description);
      };
    };
    ChildProcess one(storeOne("one"));
    ChildProcess two(storeOne("two"));
    ASSERT_EQ(one.wait().exitStatus, 0);
    ASSERT_EQ(two.wait().exitStatus, 0);
    restart();
    ASSERT_THAT(get("a", "one"), Optional(CredentialContent{.token = "one"}));
    ASSERT_THAT(get("a", "two"), Optional(CredentialContent{.token = "two"}));
  }
}

TEST_F(AVault, ThatIsDamagedIsSetAsideAndNotReplacedInSilence) {
  set("a", "client", {.token = "token"});
  vault.reset();
  overwrite(options.path, 0, std::string(100, 'x'));
  const KeychainError error = failure();
  EXPECT_EQ(error.code(), KeychainErrorTampered);
  EXPECT_THAT(error.what(), HasSubstr("set aside"));
  EXPECT_EQ(failure().code(), KeychainErrorTampered);
}

TEST_F(AVault, OnAFullDiskKeepsWhatItHas) {
  set("a", "client", {.token = "old"});
  disk::watch(folder.path());
  disk::order(disk::Fault::failsFromNow, 1, ENOSPC);
  const std::optional<Error> error = set("a", "client", {.token = "new"});
  const std::optional<Error> removal = vault->removeCredentialForAccount(makeAccount("a"), "client");
  disk::withdraw();
  ASSERT_TRUE(error);
  EXPECT_EQ(error->code, KeychainErrorStorage);
  EXPECT_THAT(error->description, Optional(HasSubstr("free some space")));
  EXPECT_TRUE(removal);
  EXPECT_THAT(get("a", "client"), Optional(CredentialContent{.token = "old"}));
}

TEST_F(AVault, MadeOnAFailingDiskHasAWholeKeyOrNone) {
  disk::watch(folder.path());
  for (std::size_t call = 1;; ++call) {
    SCOPED_TRACE("the disk fails at call " + std::to_string(call));
    vault.reset();
    std::filesystem::remove_all(options.path.parent_path());
    disk::order(disk::Fault::failsFromNow, call, ENOSPC);
    try {
      restart();
      if (const auto error = set("a", "client", {.token = "lost"})) {
        EXPECT_THAT(error->code, testing::AnyOf(KeychainErrorStorage, KeychainErrorKey)) << *error->description;
      }
    } catch (const KeychainError& error) {
      EXPECT_THAT(error.code(), testing::AnyOf(KeychainErrorStorage, KeychainErrorKey)) << error.what();
    }
    const bool hasFailed = disk::withdraw();
    restart();
    EXPECT_EQ(set("a", "client", {.token = "token"}), std::nullopt);
    EXPECT_THAT(get("a", "client"), Optional(CredentialContent{.token = "token"}));
    if (!hasFailed || HasFailure()) break;
  }
}

TEST_F(AVault, InAReadOnlyFolderSaysSo) {
  vault.reset();
  std::filesystem::remove_all(options.path.parent_path());
  const Unprivileged user(folder.path());
  restart();
  vault.reset();
  ASSERT_EQ(chmod(options.path.parent_path().c_str(), 0500), 0);
  const KeychainError error = failure();
  EXPECT_EQ(error.code(), KeychainErrorStorage);
  EXPECT_THAT(error.what(), HasSubstr(options.path.string()));
}

TEST_F(AVault, RefusesAnAccountObjectThatIsNotOutOfTheStore) {
  class Other final : public Account {
   public:
    std::string description() const override { return "other"; }
    void setAccountType(std::shared_ptr<const AccountType>) override {}
    std::shared_ptr<const AccountCredential> credential() const override { return nullptr; }
    void setCredential(std::shared_ptr<const AccountCredential>) override {}
  };
  const auto other = std::make_shared<Other>();
  EXPECT_THROW(vault->credentialForAccount(other, "client"), KeychainError);
  const std::optional<Error> error = vault->setCredentialForAccount(other, "client");
  ASSERT_TRUE(error);
  EXPECT_EQ(error->code, KeychainErrorForeignAccount);
  EXPECT_TRUE(vault->removeCredentialForAccount(nullptr, "client"));
}

TEST_F(AVault, RefusesATokenThatWouldNotReadBack) {
  set("a", "client", {.token = "old"});
  for (const std::string& odd : {std::string("a\0b", 3), std::string("\xff")}) {
    const std::optional<Error> error = set("a", "client", {.token = odd});
    ASSERT_TRUE(error);
    EXPECT_EQ(error->code, KeychainErrorNotRepresentable);
  }
  EXPECT_THAT(get("a", "client"), Optional(CredentialContent{.token = "old"}));
}

TEST_F(AVault, RefusesAnAccountThatHoldsNoCredential) {
  const std::optional<Error> error = vault->setCredentialForAccount(makeAccount("a"), "client");
  ASSERT_TRUE(error);
  EXPECT_EQ(error->code, KeychainErrorNotRepresentable);
}

}  // namespace
}  // namespace palisade
