// What every keychain promises, whoever keeps the secrets.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "Host/Keychain/Keychain.h"
#include "Tests/Contract/KeychainKinds.h"
#include "Tests/Host/Store/KeychainEntries.h"

namespace palisade {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::Optional;

using ClientID = std::optional<std::string>;

class AKeychain : public testing::TestWithParam<KeychainKind> {
 protected:
  std::optional<Error> set(const std::string& account, const ClientID& client, const CredentialContent& content) {
    const auto object = tested->account(account);
    object->setCredential(std::make_shared<const AccountCredential>(content));
    return tested->keychain().setCredentialForAccount(object, client);
  }

  std::optional<Error> setToken(const std::string& account, const ClientID& client, const std::string& token) {
    return set(account, client, {.token = token});
  }

  std::optional<CredentialContent> get(const std::string& account, const ClientID& client) {
    return contentOf(tested->keychain().credentialForAccount(tested->account(account), client));
  }

  std::optional<std::string> token(const std::string& account, const ClientID& client) {
    const auto content = get(account, client);
    return content ? content->token : std::nullopt;
  }

  std::optional<Error> remove(const std::string& account, const ClientID& client) {
    return tested->keychain().removeCredentialForAccount(tested->account(account), client);
  }

  const std::unique_ptr<KeychainUnderTest> tested = GetParam().make();
};

TEST_P(AKeychain, HasNoneOfWhatWasNeverStored) {
  EXPECT_EQ(get("a", std::nullopt), std::nullopt);
  EXPECT_EQ(get("a", "client"), std::nullopt);
}

TEST_P(AKeychain, GivesBackEveryFieldOfACredential) {
  const CredentialContent cases[]{
      {.token = "EAAB"},
      {.token = std::nullopt},
      {.token = ""},
      {.token = "EAAB", .refreshToken = "refresh", .expiryDate = Date(std::chrono::seconds(1'234'567'890))},
      {.token = "before 1970", .expiryDate = Date(std::chrono::seconds(-1))},
      {.token = "odd \" \\ \n \t ä 😀", .refreshToken = "{\"not\": \"ours\"}"},
      {.token = std::string(20'000, 'x')}};
  for (const CredentialContent& each : cases) {
    ASSERT_EQ(set("a", "client", each), std::nullopt);
    EXPECT_THAT(get("a", "client"), Optional(each));
  }
}

TEST_P(AKeychain, ReplacesWhatWasThere) {
  setToken("a", "client", "old");
  EXPECT_EQ(setToken("a", "client", "new"), std::nullopt);
  EXPECT_EQ(token("a", "client"), "new");
}

TEST_P(AKeychain, KeepsAccountsAndClientsApart) {
  const std::pair<std::string, ClientID> entries[]{{"a", std::nullopt}, {"a", ""},       {"a", "account"},   {"a", "client"},
                                                   {"a", "client2"},    {"b", "client"}, {"b", std::nullopt}};
  for (const auto& [account, client] : entries) setToken(account, client, account + client.value_or("none"));
  for (const auto& [account, client] : entries) {
    EXPECT_EQ(token(account, client), account + client.value_or("none")) << account << ", " << client.value_or("none");
  }
}

TEST_P(AKeychain, RemovesOneEntry) {
  setToken("a", std::nullopt, "master");
  setToken("a", "client", "token");
  setToken("a", "other", "other token");
  EXPECT_EQ(remove("a", "client"), std::nullopt);
  EXPECT_EQ(get("a", "client"), std::nullopt);
  EXPECT_EQ(token("a", "other"), "other token");
  EXPECT_EQ(token("a", std::nullopt), "master");
}

TEST_P(AKeychain, RemovesTheAccountsOwnEntryWithoutTheClients) {
  setToken("a", std::nullopt, "master");
  setToken("a", "client", "token");
  EXPECT_EQ(remove("a", std::nullopt), std::nullopt);
  EXPECT_EQ(get("a", std::nullopt), std::nullopt);
  EXPECT_EQ(token("a", "client"), "token");
}

TEST_P(AKeychain, RemovesWhatIsNotThereWithoutAnError) { EXPECT_EQ(remove("a", "client"), std::nullopt); }

TEST_P(AKeychain, StoresAgainWhatWasRemoved) {
  setToken("a", "client", "old");
  remove("a", "client");
  setToken("a", "client", "new");
  EXPECT_EQ(token("a", "client"), "new");
}

INSTANTIATE_TEST_SUITE_P(Kinds, AKeychain, testing::ValuesIn(keychainKinds()),
                         [](const auto& each) { return each.param.name; });

class AListingKeychain : public AKeychain {
 protected:
  std::vector<std::string> clientsOf(const std::string& account) {
    return dynamic_cast<Keychain&>(tested->keychain()).clientIDsWithCredentials(tested->account(account));
  }
};

TEST_P(AListingKeychain, ListsTheClientsOfAnAccountWithoutTheAccountItself) {
  EXPECT_THAT(clientsOf("a"), IsEmpty());
  setToken("a", std::nullopt, "master");
  for (const char* client : {"org.example.b", "org.example.a", ""}) setToken("a", client, "token");
  setToken("b", "org.example.c", "token");
  EXPECT_THAT(clientsOf("a"), ElementsAre("", "org.example.a", "org.example.b"));
  remove("a", "org.example.a");
  EXPECT_THAT(clientsOf("a"), ElementsAre("", "org.example.b"));
}

INSTANTIATE_TEST_SUITE_P(Kinds, AListingKeychain, testing::ValuesIn(listingKeychainKinds()),
                         [](const auto& each) { return each.param.name; });

}  // namespace
}  // namespace palisade
