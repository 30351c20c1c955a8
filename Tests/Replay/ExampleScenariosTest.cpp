#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <ostream>
#include <string>
#include <vector>

#include "Host/Json/Json.h"
#include "Tests/Replay/ReplayProgram.h"

namespace palisade {
namespace {

using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::SizeIs;

struct Story {
  const char* file;
  std::vector<std::string> outcomes;
  std::size_t alerts;
  std::size_t storedRecords;
};

void PrintTo(const Story& row, std::ostream* stream) { *stream << row.file; }

const Story stories[] = {
    {"audience-changed", {"0 granted", "1 granted"}, 1, 1},
    {"default-access-without-an-account", {"0 granted", "1 refused with AccountsErrorDomain 6"}, 0, 1},
    {"direct-authorization", {"0 granted", "1 refused with org.example.store 28"}, 0, 2},
    {"first-consent", {"1 granted", "2 granted"}, 1, 1},
    {"ignore-requests-preference", {"0 refused"}, 1, 0},
    {"refused-extension-keeps-the-grant", {"0 refused with AccountsErrorDomain 7", "1 granted"}, 1, 0},
    {"refused-stays-refused", {"0 refused with AccountsErrorDomain 7", "1 refused"}, 1, 1},
    {"revoke-all", {"0 granted"}, 0, 0},
    {"revoked-then-asked-again", {"0 granted", "1 refused"}, 0, 1},
    {"server-down", {"0 refused with org.example.transport 7"}, 1, 0},
    {"server-never-answers", {"0 blocked-forever by semaphore", "2 granted"}, 0, 1},
    {"unknown-permission-described", {"0 granted"}, 1, 1},
    {"unknown-permission-undescribed", {"0 refused with AccountsErrorDomain 7"}, 0, 1},
    {"user-never-answers", {"0 blocked-forever by alert", "1 refused with AccountsErrorDomain 7"}, 2, 1},
};

std::string pathOf(const std::string& story) { return SCENARIOS_FOLDER "/" + story + ".json"; }

class AnExampleScenario : public ::testing::TestWithParam<Story> {};

TEST_P(AnExampleScenario, EndsAsItsStoryTells) {
  const ReplayRun run = runReplay({"--module", PLUGIN_MODULE, pathOf(GetParam().file)});
  ASSERT_THAT(run.results(), SizeIs(1)) << run.errors;
  const Value result = run.results()[0];
  EXPECT_EQ(run.exitStatus, 0);
  EXPECT_EQ(outcomesOf(result), GetParam().outcomes);
  EXPECT_THAT(eventsOf(result, "SystemAlert.createAlert"), SizeIs(GetParam().alerts));
  EXPECT_THAT(eventsOf(result, "AuthorizationManager.setAuthorization"), SizeIs(GetParam().storedRecords));
}

TEST_P(AnExampleScenario, GivesTheSameTraceEveryTime) {
  const std::vector<std::string> arguments{"--module", PLUGIN_MODULE, pathOf(GetParam().file)};
  EXPECT_EQ(runReplay(arguments).output, runReplay(arguments).output);
}

TEST_P(AnExampleScenario, IsToldInTheReadme) {
  EXPECT_THAT(contentOf(SCENARIOS_FOLDER "/README.md"), HasSubstr("`" + std::string(GetParam().file) + ".json`"));
}

INSTANTIATE_TEST_SUITE_P(Stories, AnExampleScenario, ::testing::ValuesIn(stories),
                         [](const ::testing::TestParamInfo<Story>& row) {
                           std::string name = row.param.file;
                           std::erase(name, '-');
                           return name;
                         });

TEST(TheExampleScenarios, AreAllInTheTable) {
  std::vector<std::string> untold;
  for (const auto& entry : std::filesystem::directory_iterator(SCENARIOS_FOLDER)) {
    if (entry.path().extension() != ".json") continue;
    if (std::ranges::none_of(stories, [&](const Story& story) { return entry.path().stem() == story.file; })) {
      untold.push_back(entry.path().filename());
    }
  }
  EXPECT_THAT(untold, IsEmpty());
}

TEST(TheExampleScenarios, MayBeCarriedOutTogetherWithTheSameResults) {
  std::string lines;
  std::string expected;
  for (const Story& story : stories) {
    const auto parsed = NlohmannJsonParser().parse(contentOf(pathOf(story.file)), JsonFragments::refused);
    ASSERT_TRUE(parsed.value) << story.file;
    lines += writeJson(*parsed.value) + '\n';
    expected += runReplay({"--module", PLUGIN_MODULE, pathOf(story.file)}).output;
  }
  EXPECT_EQ(runReplay({"--module", PLUGIN_MODULE, "--lines"}, lines).output, expected);
}

}  // namespace
}  // namespace palisade
