#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <csignal>
#include <ostream>
#include <string>
#include <vector>

#include "Host/Json/Json.h"
#include "Tests/Replay/ReplayProgram.h"

namespace palisade {
namespace {

using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::Eq;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;
using ::testing::SizeIs;
using ::testing::StartsWith;

ReplayRun replayLines(const std::string& lines) { return runReplay({"--module", TEST_MODULE, "--lines"}, lines); }

// A scenario that is written on several lines, on one.
std::string oneLine(std::string scenario) {
  std::ranges::replace(scenario, '\n', ' ');
  return scenario + '\n';
}

// A scenario whose requests carry these wishes for the test module, one after the other.
std::string scenarioOf(const std::vector<std::string>& wishes) {
  std::string operations;
  for (const std::string& wish : wishes) {
    if (!operations.empty()) operations += ", ";
    operations += R"({"name": "handleAccessRequest", "client": "c", "options": {"FacebookAppIdKey": ")" + wish + "\"}}";
  }
  return R"({"id": "s", "clients": {"c": {}}, "operations": [)" + operations + "]}\n";
}

std::vector<std::string> outcomesOfWishes(const std::vector<std::string>& wishes) {
  const ReplayRun run = replayLines(scenarioOf(wishes));
  EXPECT_THAT(run.results(), SizeIs(1)) << run.errors;
  return outcomesOf(run.results().at(0));
}

struct OperationEndCase {
  const char* name;
  std::vector<std::string> wishes;
  std::vector<std::string> outcomes;
};

void PrintTo(const OperationEndCase& row, std::ostream* stream) { *stream << row.name; }

class AnOperationOfAModule : public ::testing::TestWithParam<OperationEndCase> {};

TEST_P(AnOperationOfAModule, IsReportedAsItEnds) { EXPECT_EQ(outcomesOfWishes(GetParam().wishes), GetParam().outcomes); }

const std::string refused = "refused with AccountsErrorDomain 7";
const std::string crashed = "crash " + std::to_string(SIGABRT);

INSTANTIATE_TEST_SUITE_P(
    Ends, AnOperationOfAModule,
    ::testing::Values(
        OperationEndCase{"Completing", {""}, {"0 granted with AccountsErrorDomain 7"}},
        OperationEndCase{"CompletingTwice", {"complete twice"}, {"0 granted with AccountsErrorDomain 7", "0 refused"}},
        OperationEndCase{"Crashing", {"", "crash"}, {crashed}},
        OperationEndCase{"CrashingOnAQueue", {"throw on a queue"}, {crashed}},
        OperationEndCase{"EndingTheProcess", {"exit"}, {"error: the plug-in ended the process with exit status 3"}},
        OperationEndCase{"WaitingForEver", {"wait", ""}, {"0 blocked-forever by semaphore", "1 " + refused}},
        OperationEndCase{"ReturningWithoutCompleting", {"return"}, {}},
        OperationEndCase{"CompletingAndThenWaitingForEver",
                         {"complete and wait", ""},
                         {"0 granted with AccountsErrorDomain 7", "1 " + refused}}),
    [](const ::testing::TestParamInfo<OperationEndCase>& row) { return row.param.name; });

TEST(AModule, StartsFreshInEveryScenario) {
  const ReplayRun run = replayLines(scenarioOf({"", ""}) + scenarioOf({""}));
  ASSERT_THAT(run.results(), SizeIs(2));
  EXPECT_THAT(outcomesOf(run.results()[0]), ElementsAre("0 granted with AccountsErrorDomain 7", "1 " + refused));
  EXPECT_THAT(outcomesOf(run.results()[1]), ElementsAre("0 granted with AccountsErrorDomain 7"));
}

TEST(AModule, ThatPrintsDoesNotDisturbTheResults) {
  const ReplayRun run = replayLines(scenarioOf({"print"}));
  EXPECT_THAT(run.results(), SizeIs(1));
  EXPECT_THAT(run.output, Not(HasSubstr("a plug-in that prints")));
}

TEST(AModule, ThatMakesNoObjectIsAnError) {
  const ReplayRun run = replayLines(R"({"operations": [{"name": "newPlugin"}, {"name": "newPlugin"}]})");
  EXPECT_THAT(outcomesOf(run.results().at(0)), ElementsAre("error: operations[1]: the module made no plug-in object"));
  EXPECT_EQ(run.exitStatus, 2);
}

TEST(ATrace, HasACallAndAReturnForEveryOperation) {
  const ReplayRun run = replayLines(oneLine(R"({"id": "s", "clients": {"c": {}}, "operations": [
      {"name": "supportsAccountType", "identifier": "org.example.type"},
      {"name": "newPlugin"}, {"name": "environmentChange"}, {"name": "revokeAllAccess"}]})"));
  std::string expected = R"({"scenario":"s","events":[)"
                         R"({"event":"call","thread":"daemon","operation":0,"name":"supportsAccountType"},)"
                         R"({"event":"return","thread":"daemon","operation":0,"name":"supportsAccountType","result":true},)"
                         R"({"event":"call","thread":"daemon","operation":1,"name":"newPlugin"},)"
                         R"({"event":"return","thread":"daemon","operation":1,"name":"newPlugin"},)"
                         R"({"event":"call","thread":"daemon","operation":2,"name":"environmentChange"},)"
                         R"({"event":"return","thread":"daemon","operation":2,"name":"environmentChange"},)"
                         R"({"event":"call","thread":"daemon","operation":3,"name":"revokeAllAccess"},)"
                         R"({"event":"completion","thread":"daemon","operation":3,"granted":true,"error":null},)"
                         R"({"event":"return","thread":"daemon","operation":3,"name":"revokeAllAccess"}]})"
                         "\n";
  EXPECT_EQ(run.output, expected);
}

TEST(ATrace, NamesConstantsAndKeepsNullsApart) {
  const ReplayRun run = replayLines(oneLine(R"({"clients": {"c": {}}, "operations": [
      {"name": "handleAccessRequest", "client": "c", "options": {
          "FacebookAppIdKey": "record", "FacebookAudienceKey": "FacebookAudienceFriends", "other": [null, {"x": null}]}}]})"));
  EXPECT_EQ(writeJson(eventsOf(run.results().at(0), "AuthorizationManager.setAuthorization").at(0)),
            R"({"event":"AuthorizationManager.setAuthorization","thread":"daemon","client":{"$client":"c"},)"
            R"("accountType":"AccountTypeIdentifierFacebook","record":{"client":{"$client":"c"},"granted":false,)"
            R"("options":{"FacebookAppIdKey":"record","FacebookAudienceKey":"FacebookAudienceFriends",)"
            R"("other":[{"$null":true},{"x":{"$null":true}}]},"permissions":null}})");
}

TEST(ATrace, HoldsWhatAQueueDidAfterTheOperation) {
  const ReplayRun run = replayLines(scenarioOf({"queue"}));
  EXPECT_EQ(writeJson(eventsOf(run.results().at(0), "log").at(0)),
            R"({"event":"log","thread":"preferences","level":7,"operationName":"later","format":"%@ of %d",)"
            R"~("args":["(null)","2"],"argumentNames":"first, second","rendered":"(null) of 2"})~");
}

TEST(ATable, GivesTheTextsBesideTheModuleInTheLanguageOfTheUser) {
  const auto greetingWith = [](const std::vector<std::string>& language, const std::string& strings) {
    std::vector<std::string> arguments{"--module", TEST_MODULE, "--lines"};
    arguments.insert(arguments.end(), language.begin(), language.end());
    const std::string scenario =
        R"({"clients": {"c": {}}, "strings": {)" + strings +
        R"(}, "operations": [)"
        R"({"name": "handleAccessRequest", "client": "c", "options": {"FacebookAppIdKey": "greet"}}]})";
    const Value log = eventsOf(runReplay(arguments, scenario).results().at(0), "log").at(0);
    return *log.dictionary()->find("rendered")->string();
  };
  EXPECT_EQ(greetingWith({}, ""), "Hello");
  EXPECT_EQ(greetingWith({"--strings", "de"}, ""), "Hallo");
  EXPECT_EQ(greetingWith({"--strings", "fi"}, ""), "Hello") << "a language without texts falls back to English";
  EXPECT_EQ(greetingWith({"--strings", "de"}, R"("GREETING": "Servus")"), "Servus");
  EXPECT_EQ(greetingWith({"--strings", "de"}, R"("GREETING": null)"), "none");
}

TEST(ABatchOfScenarios, AnswersEveryLineInOrderWhateverItIs) {
  const ReplayRun run = replayLines(scenarioOf({""}) + "nonsense\n" + R"({"id": "x", "operations": 5})" + "\n" +
                                    scenarioOf({"crash"}) + scenarioOf({"wait"}));
  const auto results = run.results();
  ASSERT_THAT(results, SizeIs(5));
  EXPECT_THAT(outcomesOf(results[0]), ElementsAre("0 granted with AccountsErrorDomain 7"));
  EXPECT_THAT(writeJson(results[1]), StartsWith(R"({"scenario":null,"error":"the scenario cannot be read: Line 1, column )"));
  EXPECT_EQ(writeJson(results[2]), R"({"scenario":"x","error":"operations: has to be an array, is a number"})");
  EXPECT_EQ(writeJson(results[3]), R"({"scenario":"s","crash":6})");
  EXPECT_THAT(outcomesOf(results[4]), ElementsAre("0 blocked-forever by semaphore"));
  EXPECT_EQ(run.exitStatus, 2);
}

TEST(ABatchOfScenarios, ReadsOnesThatAreNestedDeeply) {
  const auto nested = [](std::size_t depth) {
    return R"({"preference": )" + std::string(depth, '[') + std::string(depth, ']') + R"(, "operations": []})" + "\n";
  };
  const auto results = replayLines(nested(511) + nested(512)).results();
  EXPECT_THAT(outcomesOf(results.at(0)), IsEmpty());
  EXPECT_THAT(outcomesOf(results.at(1)), ElementsAre(StartsWith("error: the scenario cannot be read: ")));
}

TEST(TheExitStatus, TellsTheWorstThatHappened) {
  EXPECT_EQ(replayLines(scenarioOf({""})).exitStatus, 0);
  EXPECT_EQ(replayLines(scenarioOf({"wait"})).exitStatus, 0);
  EXPECT_EQ(replayLines(scenarioOf({""}) + scenarioOf({"crash"}) + scenarioOf({""})).exitStatus, 1);
  EXPECT_EQ(replayLines("nonsense").exitStatus, 2);
}

struct UsageCase {
  const char* name;
  std::vector<std::string> arguments;
  int exitStatus;
  const char* output;
  const char* errors;
};

void PrintTo(const UsageCase& row, std::ostream* stream) { *stream << row.name; }

class ACommandLine : public ::testing::TestWithParam<UsageCase> {};

TEST_P(ACommandLine, IsAnsweredClearly) {
  const ReplayRun run = runReplay(GetParam().arguments);
  EXPECT_EQ(run.exitStatus, GetParam().exitStatus);
  EXPECT_THAT(run.output, HasSubstr(GetParam().output));
  EXPECT_THAT(run.errors, HasSubstr(GetParam().errors));
}

INSTANTIATE_TEST_SUITE_P(
    Usage, ACommandLine,
    ::testing::Values(
        UsageCase{"Help", {"--help"}, 0, "plugin-replay --module", ""},
        UsageCase{"Nothing", {}, 2, "", "plugin-replay: --module is required"},
        UsageCase{"NoScenario", {"--module", TEST_MODULE}, 2, "", "plugin-replay: SCENARIO.json or --lines is required"},
        UsageCase{"UnknownOption", {"--modul", "x"}, 2, "", "plugin-replay: "},
        UsageCase{"BothKinds", {"--module", TEST_MODULE, "--lines", "x.json"}, 2, "", "plugin-replay: "},
        UsageCase{"MissingFile", {"--module", TEST_MODULE, "/nowhere/x.json"}, 2, "", "/nowhere/x.json cannot be read"},
        UsageCase{"AFolderForAFile", {"--module", TEST_MODULE, "/tmp"}, 2, "", "/tmp cannot be read"},
        UsageCase{"MissingModule", {"--module", "/nowhere/m.so", "--lines"}, 2, "", "/nowhere/m.so"}),
    [](const ::testing::TestParamInfo<UsageCase>& row) { return row.param.name; });

}  // namespace
}  // namespace palisade
