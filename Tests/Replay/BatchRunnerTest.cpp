#include "Tools/PluginReplay/BatchRunner.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <unistd.h>

#include <array>
#include <csignal>
#include <cstdlib>
#include <sstream>
#include <streambuf>
#include <string>
#include <vector>

namespace palisade {
namespace {

using ::testing::ElementsAre;
using ::testing::Eq;
using ::testing::HasSubstr;

// What the child does is written in the line itself.
ScenarioResult carryOutLine(const std::string& line, const AnnounceID& announceID) {
  announceID(line);
  if (line == "abort") std::abort();
  if (line == "exit") std::_Exit(3);
  if (line == "leave at once") std::_Exit(0);
  if (line == "malformed") return {.line = "refused", .outcome = ScenarioOutcome::malformed};
  if (line == "large") return {.line = std::string(1'000'000, 'x')};
  return {.line = "done " + line};
}

class Pipe {
 public:
  Pipe() {
    if (pipe(_ends.data()) != 0) std::abort();
  }
  ~Pipe() {
    close(_ends[0]);
    closeInput();
  }

  int output() const { return _ends[0]; }
  void write(const std::string& text) { EXPECT_EQ(::write(_ends[1], text.data(), text.size()), ssize_t(text.size())); }
  void closeInput() {
    if (_ends[1] >= 0) close(_ends[1]);
    _ends[1] = -1;
  }

 private:
  std::array<int, 2> _ends{};
};

struct BatchResult {
  ScenarioOutcome outcome;
  std::vector<std::string> lines;
};

BatchResult runLines(const std::string& input) {
  Pipe pipe;
  pipe.write(input);
  pipe.closeInput();
  std::stringstream output;
  const ScenarioOutcome outcome = runBatch(pipe.output(), output, 2, carryOutLine);
  std::vector<std::string> lines;
  for (std::string line; std::getline(output, line);) lines.push_back(line);
  return {outcome, lines};
}

TEST(ABatch, WritesResultsInTheOrderOfTheInput) {
  std::string input;
  std::vector<std::string> expected;
  for (int number = 0; number < 200; ++number) {
    input += std::to_string(number) + '\n';
    expected.push_back("done " + std::to_string(number));
  }
  EXPECT_EQ(runLines(input).lines, expected);
}

TEST(ABatch, CarriesOutALastLineWithoutAnEnd) { EXPECT_THAT(runLines("a\nb").lines, ElementsAre("done a", "done b")); }

TEST(ABatch, AnswersAnEmptyLineToo) { EXPECT_THAT(runLines("a\n\nb\n").lines, ElementsAre("done a", "done ", "done b")); }

TEST(ABatch, IsEmptyWithoutInput) {
  const BatchResult result = runLines("");
  EXPECT_THAT(result.lines, ElementsAre());
  EXPECT_EQ(result.outcome, ScenarioOutcome::carriedOut);
}

TEST(ABatch, TakesResultsOfAnySize) { EXPECT_THAT(runLines("large\n").lines.at(0).size(), Eq(1'000'000u)); }

TEST(ABatch, GoesOnAfterACrashAndTellsTheSignal) {
  const BatchResult result = runLines("a\nabort\nb\n");
  EXPECT_THAT(result.lines, ElementsAre("done a", R"({"scenario":"abort","crash":)" + std::to_string(SIGABRT) + "}", "done b"));
  EXPECT_EQ(result.outcome, ScenarioOutcome::crashed);
}

TEST(ABatch, TellsWhenAProcessWasEndedFromWithin) {
  const BatchResult result = runLines("exit\nleave at once\n");
  EXPECT_THAT(result.lines, ElementsAre(HasSubstr(R"("error":"the plug-in ended the process with exit status 3")"),
                                        HasSubstr(R"("error":"the plug-in ended the process with exit status 0")")));
  EXPECT_EQ(result.outcome, ScenarioOutcome::crashed);
}

TEST(ABatch, IsMalformedWhenOneOfItsScenariosIs) {
  const BatchResult result = runLines("abort\nmalformed\na\n");
  EXPECT_EQ(result.outcome, ScenarioOutcome::malformed);
  EXPECT_THAT(result.lines.at(1), Eq("refused"));
}

// A program that writes one scenario, waits for its result and only then writes the next one must not wait for ever.
TEST(ABatch, WritesAResultBeforeTheNextLineIsThere) {
  class Conversation : public std::stringbuf {
   public:
    explicit Conversation(Pipe& pipe) : _pipe(pipe) {}

    int sync() override {
      if (++_answers < 3) {
        _pipe.write("next\n");
      } else {
        _pipe.closeInput();
      }
      return 0;
    }

   private:
    Pipe& _pipe;
    int _answers = 0;
  };

  Pipe pipe;
  Conversation conversation(pipe);
  std::ostream output(&conversation);
  pipe.write("first\n");
  runBatch(pipe.output(), output, 2, carryOutLine);
  EXPECT_EQ(conversation.str(), "done first\ndone next\ndone next\n");
}

TEST(AScenarioProcess, IsEndedTogetherWithItsObject) {
  const CarryOut never = [](const std::string&, const AnnounceID&) -> ScenarioResult {
    for (;;) pause();
  };
  Pipe pipe;
  {
    const ScenarioProcess process("", never);
    pipe.closeInput();
  }
  // The child held a copy of the pipe's other end; it reads as closed once the child is gone.
  char nothing = 0;
  EXPECT_EQ(read(pipe.output(), &nothing, 1), 0);
}

}  // namespace
}  // namespace palisade
