#include "Tools/PluginReplay/ScenarioReader.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <ostream>
#include <string>

#include "Host/Json/Json.h"
#include "Platform/AccountConstants.h"

namespace palisade {
namespace {

using ::testing::ElementsAre;
using ::testing::Eq;
using ::testing::Field;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::IsNull;
using ::testing::Optional;
using ::testing::Pair;
using ::testing::Pointee;
using ::testing::ThrowsMessage;
using ::testing::UnorderedElementsAre;
using ::testing::VariantWith;

Value document(const std::string& json) {
  const auto parsed = NlohmannJsonParser(NlohmannJsonParser::greatestDepth).parse(json, JsonFragments::allowed);
  EXPECT_TRUE(parsed.value) << json;
  return parsed.value.value_or(Value());
}

Scenario read(const std::string& json) { return readScenario(document(json)); }

struct MalformedScenario {
  const char* json;
  const char* message;
};

void PrintTo(const MalformedScenario& row, std::ostream* stream) { *stream << row.json; }

const MalformedScenario malformedScenarios[] = {
    {R"([])", R"(the scenario: has to be an object, is an array)"},
    {R"(null)", R"(the scenario: has to be an object, is null)"},
    {R"({})", R"(the scenario: the member "operations" is missing)"},
    {R"({"operations": {}})", R"(operations: has to be an array, is an object)"},
    {R"({"operatoins": []})",
     R"(operatoins: there is no such member; there are: id, clients, accountType, accounts, keychain,)"},
    {R"({"id": 5, "operations": []})", R"(id: has to be a text, is a number)"},
    {R"({"clients": [], "operations": []})", R"(clients: has to be an object, is an array)"},
    {R"({"clients": {"a": {"bundelID": "b"}}, "operations": []})",
     R"(clients.a.bundelID: there is no such member; there are: bundleID, appName, description, entitlements)"},
    {R"({"clients": {"a": {"bundleID": 1}}, "operations": []})", R"(clients.a.bundleID: has to be a text, is a number)"},
    {R"({"clients": {"a": {"appName": null}}, "operations": []})", R"(clients.a.appName: has to be a text, is null)"},
    {R"({"clients": {"a b": {"entitlements": [true]}}, "operations": []})",
     R"(clients["a b"].entitlements[0]: has to be a text, is a boolean)"},
    {R"({"accountType": "x", "operations": []})", R"(accountType: has to be an object, is a text)"},
    {R"({"accountType": {}, "operations": []})", R"(accountType: the member "identifier" is missing)"},
    {R"({"accounts": [{"type": "t"}], "operations": []})", R"(accounts[0]: the member "id" is missing)"},
    {R"({"accounts": [{"id": "1", "name": "t"}], "operations": []})", R"(accounts[0].name: there is no such member)"},
    {R"({"keychain": [{"account": "1", "oauthToken": 7}], "operations": []})",
     R"(keychain[0].oauthToken: has to be a text, is a number)"},
    {R"({"records": [{"client": "x", "granted": true}], "operations": []})", R"(records[0].client: no client "x" is defined)"},
    {R"({"clients": {"x": {}}, "records": [{"client": "x"}], "operations": []})",
     R"(records[0]: the member "granted" is missing)"},
    {R"({"clients": {"x": {}}, "records": [{"client": "x", "granted": 1}], "operations": []})",
     R"(records[0].granted: has to be a boolean, is a number)"},
    {R"({"clients": {"x": {}}, "records": [{"client": "x", "granted": true, "options": []}], "operations": []})",
     R"(records[0].options: has to be an object, is an array)"},
    {R"({"clients": {"x": {}}, "records": [{"client": "x", "granted": true, "permissions": ["a", null]}], "operations": []})",
     R"(records[0].permissions[1]: has to be a text, is null)"},
    {R"({"storeErrors": [null, {"domain": "d"}], "operations": []})", R"(storeErrors[1]: the member "code" is missing)"},
    {R"({"storeErrors": [{"domain": "d", "code": 1.5}], "operations": []})",
     R"(storeErrors[0].code: has to be a whole number from -2147483648 to 2147483647, is 1.5)"},
    {R"({"storeErrors": [{"domain": "d", "code": 2147483648}], "operations": []})", R"(is 2147483648)"},
    {R"({"storeErrors": [{"domain": "d", "code": "7"}], "operations": []})",
     R"(storeErrors[0].code: has to be a whole number, is a text)"},
    {R"({"preference": null, "operations": []})", R"(preference: has to be a value; leave it out when there is none)"},
    {R"({"alert": 0, "operations": []})", R"(alert: has to be an array or an object, is a number)"},
    {R"({"alert": {"handel": true}, "operations": []})",
     R"(alert.handel: there is no such member; there are: handle, status, word)"},
    {R"({"alert": [{}, {"word": "sometimes"}], "operations": []})",
     R"(alert[1].word: has to be an unsigned machine word, null or "never")"},
    {R"({"alert": {"word": -1}, "operations": []})", R"(alert.word: has to be an unsigned machine word, null or "never")"},
    {R"({"alert": {"word": 0.5}, "operations": []})", R"(alert.word: has to be an unsigned machine word, null or "never")"},
    {R"({"server": {"authorisation": []}, "operations": []})", R"(server.authorisation: there is no such member)"},
    {R"({"server": {"description": {}}, "operations": []})", R"(server.description: has to be an array, is an object)"},
    {R"({"server": {"description": [{"bodyHex": "abc"}]}, "operations": []})",
     R"(server.description[0].bodyHex: has to be two hexadecimal digits a byte, but their number is odd)"},
    {R"({"server": {"description": [{"bodyHex": "00g0"}]}, "operations": []})",
     R"(server.description[0].bodyHex: has to be hexadecimal digits, but "g0" at character 3 is not)"},
    {R"({"server": {"description": [{"bodyHex": "0x-1"}]}, "operations": []})", R"(has to be hexadecimal digits, but "0x")"},
    {R"({"server": {"description": [{"body": "", "bodyHex": ""}]}, "operations": []})",
     R"(server.description[0].bodyHex: an answer has either "body" or "bodyHex")"},
    {R"({"server": {"authorization": [{"delivery": "later"}]}, "operations": []})",
     R"(server.authorization[0].delivery: has to be "thread" or "inline", is "later")"},
    {R"({"server": {"authorization": [{"never": "yes"}]}, "operations": []})",
     R"(server.authorization[0].never: has to be a boolean, is a text)"},
    {R"({"strings": {"KEY": 1}, "operations": []})", R"(strings.KEY: has to be a text, is a number)"},
    {R"({"operations": ["newPlugin"]})", R"(operations[0]: has to be an object, is a text)"},
    {R"({"operations": [{}]})", R"(operations[0]: the member "name" is missing)"},
    {R"({"operations": [{"name": "revokeAcess"}]})", R"(operations[0].name: there is no operation "revokeAcess")"},
    {R"({"operations": [{"name": "newPlugin", "client": "x"}]})",
     R"(operations[0].client: there is no such member; there are: name)"},
    {R"({"operations": [{"name": "newPlugin"}, {"name": "revokeAccess"}]})",
     R"(operations[1]: the member "client" is missing)"},
    {R"({"operations": [{"name": "newPlugin"}, {"name": "newPlugin"}, {"name": "authorizeAccess", "client": "x"}]})",
     R"(operations[2].client: no client "x" is defined)"},
    {R"({"clients": {"x": {}}, "operations": [{"name": "authorizeAccess", "client": "x", "options": {}}]})",
     R"(operations[0].options: there is no such member; there are: name, client)"},
    {R"({"operations": [{"name": "supportsAccountType"}]})", R"(operations[0]: the member "identifier" is missing)"},
    {R"({"clients": {"x": {}}, "operations": [{"name": "handleAccessRequest", "client": "x", "options": 1}]})",
     R"(operations[0].options: has to be an object, is a number)"},
    {R"({"clients": {"x": {}}, "operations": [{"name": "handleAccessRequest", "client": "x", "allowUserInteraction": 0}]})",
     R"(operations[0].allowUserInteraction: has to be a boolean, is a number)"},
};

class AMalformedScenario : public ::testing::TestWithParam<MalformedScenario> {};

TEST_P(AMalformedScenario, IsRefusedWithTheMemberThePlaceAndTheReason) {
  EXPECT_THAT([] { read(GetParam().json); }, ThrowsMessage<ScenarioError>(HasSubstr(GetParam().message))) << GetParam().json;
}

INSTANTIATE_TEST_SUITE_P(Table, AMalformedScenario, ::testing::ValuesIn(malformedScenarios));

TEST(AScenario, NeedsNothingButOperations) {
  const Scenario scenario = read(R"({"operations": []})");
  EXPECT_EQ(scenario.accountType, AccountTypeIdentifierFacebook);
  EXPECT_THAT(scenario.preference, Eq(std::nullopt));
  EXPECT_THAT(scenario.operations, IsEmpty());
}

TEST(AScenario, IsToldByItsIDEvenWhenTheRestIsMalformed) {
  EXPECT_THAT(scenarioID(document(R"({"id": "x", "operatoins": 1})")), Optional(Eq("x")));
  EXPECT_THAT(scenarioID(document(R"({"id": 1})")), Eq(std::nullopt));
  EXPECT_THAT(scenarioID(document(R"([])")), Eq(std::nullopt));
}

TEST(AScenario, NamesConstantsWhereTheyMayStand) {
  const Scenario scenario = read(R"({
      "clients": {"x": {"entitlements": ["AllAccountsAccessEntitlement", "org.example.other"]}},
      "accountType": {"identifier": "AccountTypeIdentifierFacebook"},
      "accounts": [{"id": "1", "type": "AccountTypeIdentifierFacebook"}, {"id": "2", "type": "another"}],
      "storeErrors": [{"domain": "AccountsErrorDomain", "code": 7}],
      "operations": [{"name": "supportsAccountType", "identifier": "AccountTypeIdentifierFacebook"}]})");
  EXPECT_THAT(scenario.clients.at("x").entitlements,
              ElementsAre(std::string(AllAccountsAccessEntitlement), "org.example.other"));
  EXPECT_THAT(scenario.accounts, ElementsAre(Field(&FakeAccountData::type, Eq(AccountTypeIdentifierFacebook)),
                                             Field(&FakeAccountData::type, Eq("another"))));
  EXPECT_THAT(scenario.storeErrors, ElementsAre(Optional(Error{.domain = std::string(AccountsErrorDomain), .code = 7})));
  EXPECT_EQ(scenario.operations.at(0).identifier, AccountTypeIdentifierFacebook);
}

TEST(AScenario, KeepsANullInOptionsApartFromAnAbsentKeyAndFromNoOptions) {
  const Scenario scenario = read(R"({"clients": {"x": {}}, "operations": [
      {"name": "handleAccessRequest", "client": "x", "options": {"FacebookPermissionsKey": null}},
      {"name": "handleAccessRequest", "client": "x", "options": null},
      {"name": "handleAccessRequest", "client": "x"}]})");
  const auto& options = scenario.operations.at(0).options;
  ASSERT_NE(options->find(FacebookPermissionsKey), nullptr);
  EXPECT_TRUE(options->find(FacebookPermissionsKey)->isNull());
  EXPECT_EQ(options->find(FacebookAppIdKey), nullptr);
  EXPECT_THAT(scenario.operations.at(1).options, IsNull());
  EXPECT_THAT(scenario.operations.at(2).options, IsNull());
}

TEST(AScenario, TellsNoPermissionsFromAnEmptySet) {
  const Scenario scenario = read(R"({"clients": {"x": {}}, "records": [
      {"client": "x", "granted": true, "permissions": []}, {"client": "x", "granted": false, "permissions": null},
      {"client": "x", "granted": true, "permissions": ["a", "b", "a"]}], "operations": []})");
  EXPECT_THAT(scenario.records.at(0).permissions, Pointee(IsEmpty()));
  EXPECT_THAT(scenario.records.at(1).permissions, IsNull());
  EXPECT_THAT(scenario.records.at(2).permissions, Pointee(UnorderedElementsAre("a", "b")));
}

TEST(AScenario, MayGiveOneAlertAnswerOrAList) {
  const Scenario one = read(R"({"alert": {"word": 18446744073709551615}, "operations": []})");
  ASSERT_EQ(one.alertAnswers.size(), 1u);
  EXPECT_THAT(one.alertAnswers[0].word, VariantWith<AlertResponse>(Eq(18446744073709551615u)));
  EXPECT_TRUE(one.alertAnswers[0].handle);

  const Scenario several =
      read(R"({"alert": [{"handle": false, "status": -5}, {"word": null}, {"word": "never"}], "operations": []})");
  ASSERT_EQ(several.alertAnswers.size(), 3u);
  EXPECT_FALSE(several.alertAnswers[0].handle);
  EXPECT_EQ(several.alertAnswers[0].status, -5);
  EXPECT_TRUE(std::holds_alternative<std::monostate>(several.alertAnswers[1].word));
  EXPECT_TRUE(std::holds_alternative<NeverAnswered>(several.alertAnswers[2].word));
}

TEST(AScenario, ReadsTheServersAnswers) {
  const Scenario scenario = read(R"({"server": {"authorization": [
      {}, {"body": ""}, {"bodyHex": "00fFc3"}, {"error": {"domain": "d", "code": -1}, "body": "x"}, {"error": null},
      {"never": true}, {"never": false, "delivery": "inline"}]}, "operations": []})");
  const auto& answers = scenario.authorizationAnswers;
  ASSERT_EQ(answers.size(), 7u);
  EXPECT_THAT(answers[0].data, Eq(std::nullopt));
  EXPECT_EQ(answers[0].delivery, Delivery::onThread);
  EXPECT_THAT(answers[1].data, Optional(Eq("")));
  EXPECT_THAT(answers[2].data, Optional(Eq(std::string("\x00\xff\xc3", 3))));
  EXPECT_THAT(answers[3].error, Optional(Error{.domain = "d", .code = -1}));
  EXPECT_THAT(answers[3].data, Optional(Eq("x")));
  EXPECT_THAT(answers[4].error, Eq(std::nullopt));
  EXPECT_EQ(answers[5].delivery, Delivery::never);
  EXPECT_EQ(answers[6].delivery, Delivery::inLine);
  EXPECT_THAT(scenario.descriptionAnswers, IsEmpty());
}

TEST(AScenario, MakesAKeyMissingWithANull) {
  const Scenario scenario = read(R"({"strings": {"A": "text", "B": null}, "operations": []})");
  EXPECT_THAT(scenario.strings, ElementsAre(Pair("A", Optional(Eq("text"))), Pair("B", Eq(std::nullopt))));
}

TEST(AScenario, NamesAClientByItsIDWhereNothingElseIsSaid) {
  const Scenario scenario = read(R"({"clients": {"x": {}, "y": {"bundleID": null, "appName": "", "description": "d"}},
                                     "operations": []})");
  EXPECT_EQ(scenario.clients.at("x").appName, "x");
  EXPECT_EQ(scenario.clients.at("x").description, "x");
  EXPECT_EQ(scenario.clients.at("y").appName, "");
  EXPECT_EQ(scenario.clients.at("y").description, "d");
  EXPECT_THAT(scenario.clients.at("y").bundleID, Eq(std::nullopt));
}

}  // namespace
}  // namespace palisade
