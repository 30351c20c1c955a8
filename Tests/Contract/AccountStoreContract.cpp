// What every account store promises, whoever keeps it.

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <set>

#include "Platform/Account.h"
#include "Platform/AccountCredential.h"
#include "Tests/Contract/AccountStoreKinds.h"

namespace palisade {
namespace {

using testing::ElementsAre;
using testing::Eq;
using testing::IsEmpty;
using testing::Optional;
using testing::SizeIs;

class AnAccountStore : public testing::TestWithParam<AccountStoreKind> {
 protected:
  std::vector<std::string> descriptionsOfType(const AccountType& type) {
    std::vector<std::string> descriptions;
    for (const auto& account : tested->store().accountsWithAccountTypeIdentifier(type.identifier())) {
      descriptions.push_back(account->description());
    }
    return descriptions;
  }

  std::optional<Error> set(const std::string& clientID, const RecordContent& content, const AccountType& type = facebookType) {
    const auto client = makeClient(clientID);
    return tested->records().setAuthorization(makeRecord(client, content), client, type);
  }

  std::optional<RecordContent> get(const std::string& clientID, const AccountType& type = facebookType) {
    return contentOf(tested->records().authorizationForClient(makeClient(clientID), type));
  }

  std::vector<std::string> clientsInOrder(const AccountType& type = facebookType) {
    std::vector<std::string> clients;
    for (const auto& record : tested->records().allAuthorizationsForAccountType(type)) {
      clients.push_back(record->client()->description());
    }
    return clients;
  }

  const std::unique_ptr<AccountStoreUnderTest> tested = GetParam().make();
};

TEST_P(AnAccountStore, HasNoAccountsOfATypeOfWhichNoneWereAdded) {
  tested->addAccount(otherType.identifier(), "other");
  EXPECT_THAT(descriptionsOfType(facebookType), IsEmpty());
}

TEST_P(AnAccountStore, ListsTheAccountsOfATypeInTheOrderInWhichTheyWereAdded) {
  tested->addAccount(facebookType.identifier(), "zoe");
  tested->addAccount(otherType.identifier(), "bob");
  tested->addAccount(facebookType.identifier(), "alice");
  EXPECT_THAT(descriptionsOfType(facebookType), ElementsAre("zoe", "alice"));
}

TEST_P(AnAccountStore, MakesAFreshAccountObjectForEachLookUp) {
  tested->addAccount(facebookType.identifier(), "alice");
  const auto first = tested->store().accountsWithAccountTypeIdentifier(facebookType.identifier()).at(0);
  first->setCredential(std::make_shared<const AccountCredential>("token", "", distantFuture));
  const auto second = tested->store().accountsWithAccountTypeIdentifier(facebookType.identifier()).at(0);
  EXPECT_NE(first, second);
  EXPECT_NE(first->credential(), nullptr);
  EXPECT_EQ(second->credential(), nullptr);
}

TEST_P(AnAccountStore, HasOneAuthorizationManager) {
  EXPECT_EQ(&tested->store().authorizationManager(), &tested->store().authorizationManager());
}

TEST_P(AnAccountStore, HasNoRecordOfAClientOfWhichNoneWasStored) {
  set("other", grantNumber(1));
  EXPECT_EQ(get("client"), std::nullopt);
  EXPECT_EQ(get("", facebookType), std::nullopt);
}

TEST_P(AnAccountStore, HasNoRecordOfNoClient) {
  EXPECT_EQ(tested->records().authorizationForClient(nullptr, facebookType), nullptr);
}

TEST_P(AnAccountStore, GivesBackARecordForTheClientThatAsks) {
  set("client", grantNumber(1));
  const auto client = makeClient("client");
  const auto record = tested->records().authorizationForClient(client, facebookType);
  ASSERT_NE(record, nullptr);
  EXPECT_EQ(record->client()->description(), "client");
}

TEST_P(AnAccountStore, KeepsRecordsOfAccountTypesApart) {
  set("client", grantNumber(1), facebookType);
  set("client", refusal, otherType);
  EXPECT_THAT(get("client", facebookType), Optional(grantNumber(1)));
  EXPECT_THAT(get("client", otherType), Optional(refusal));
}

TEST_P(AnAccountStore, HasOneRecordAClientTheLatest) {
  set("client", grantNumber(1));
  set("client", refusal);
  EXPECT_THAT(get("client"), Optional(refusal));
  EXPECT_THAT(clientsInOrder(), ElementsAre("client"));
}

TEST_P(AnAccountStore, ListsRecordsInTheOrderInWhichTheClientsCameFirst) {
  for (const char* client : {"b", "c", "a"}) set(client, grantNumber(1));
  set("d", grantNumber(1), otherType);
  set("b", refusal);
  EXPECT_THAT(clientsInOrder(), ElementsAre("b", "c", "a"));
}

TEST_P(AnAccountStore, ListsRefusalsToo) {
  set("client", refusal);
  EXPECT_THAT(contentOf(tested->records().allAuthorizationsForAccountType(facebookType).at(0)), Optional(refusal));
}

TEST_P(AnAccountStore, RemovesTheRecordsOfOneType) {
  set("client", grantNumber(1), facebookType);
  set("client", grantNumber(2), otherType);
  EXPECT_EQ(tested->records().removeAllClientAuthorizationsForAccountType(facebookType), std::nullopt);
  EXPECT_EQ(get("client", facebookType), std::nullopt);
  EXPECT_THAT(clientsInOrder(), IsEmpty());
  EXPECT_THAT(get("client", otherType), Optional(grantNumber(2)));
}

TEST_P(AnAccountStore, RemovesNothingWithoutAnError) {
  EXPECT_EQ(tested->records().removeAllClientAuthorizationsForAccountType(facebookType), std::nullopt);
}

TEST_P(AnAccountStore, IsNotChangedThroughARecordThatItHandedOut) {
  set("client", grantNumber(1));
  const auto record = tested->records().authorizationForClient(makeClient("client"), facebookType);
  record->setIsGranted(false);
  record->setGrantedPermissions(nullptr);
  record->setOptions(nullptr);
  const auto listed = tested->records().allAuthorizationsForAccountType(facebookType).at(0);
  listed->setIsGranted(false);
  EXPECT_THAT(get("client"), Optional(grantNumber(1)));
}

TEST_P(AnAccountStore, IsNotChangedThroughARecordThatItTookIn) {
  const auto client = makeClient("client");
  ClientAuthorization record = makeRecord(client, grantNumber(1));
  tested->records().setAuthorization(record, client, facebookType);
  record.setIsGranted(false);
  EXPECT_THAT(get("client"), Optional(grantNumber(1)));
}

TEST_P(AnAccountStore, KeepsItsRecordsForAClientThatGoesByAnotherObject) {
  tested->records().setAuthorization(makeRecord(makeClient("old object"), grantNumber(1)), makeClient("client"), facebookType);
  EXPECT_THAT(get("client"), Optional(grantNumber(1))) << "the client that it is stored for counts";
  EXPECT_EQ(get("old object"), std::nullopt);
}

struct ContentCase {
  const char* name;
  RecordContent content;
};

TEST_P(AnAccountStore, KeepsWhatIsNoneApartFromWhatIsEmpty) {
  const ContentCase cases[]{
      {"all none", {.isGranted = true}},
      {"all empty", {.isGranted = true, .options = Dictionary{}, .permissions = std::vector<std::string>{}}},
      {"empty options", {.isGranted = true, .options = Dictionary{}}},
      {"empty permissions", {.isGranted = true, .permissions = std::vector<std::string>{}}},
      {"an empty name", {.isGranted = true, .permissions = std::vector<std::string>{""}}},
      {"a refusal with options", {.isGranted = false, .options = Dictionary{{"FacebookAppIdKey", "1"}}}},
      {"a null value", {.isGranted = true, .options = Dictionary{{"FacebookAudienceKey", nullptr}}}},
      {"an array and a number", {.isGranted = true, .options = Dictionary{{"a", Array{1, 2.0, "3", false}}, {"b", -4}}}},
      {"odd names", {.isGranted = true, .permissions = std::vector<std::string>{" ", "E-Mail", "e-mail", "ä\"\\\n"}}}};
  for (const ContentCase& each : cases) {
    ASSERT_EQ(set(each.name, each.content), std::nullopt) << each.name;
    EXPECT_THAT(get(each.name), Optional(each.content)) << each.name;
  }
}

INSTANTIATE_TEST_SUITE_P(Kinds, AnAccountStore, testing::ValuesIn(accountStoreKinds()),
                         [](const auto& each) { return each.param.name; });

}  // namespace
}  // namespace palisade
