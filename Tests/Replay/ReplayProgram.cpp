#include "Tests/Replay/ReplayProgram.h"

#include <gtest/gtest.h>

#include <sys/wait.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <sstream>

#include "Host/Json/Json.h"

namespace palisade {
namespace {

std::string quoted(const std::string& argument) {
  std::string text = "'";
  for (const char character : argument) text += character == '\'' ? "'\\''" : std::string(1, character);
  return text + '\'';
}

const Value& member(const Value& object, const char* name) {
  static const Value absent;
  const Value* value = object.dictionary() == nullptr ? nullptr : object.dictionary()->find(name);
  return value == nullptr ? absent : *value;
}

std::string outcomeOf(const Value& event) {
  const std::string operation = writeJson(member(event, "operation"));
  if (*member(event, "event").string() == "blocked-forever") {
    return operation + " blocked-forever by " + *member(event, "waiting").string();
  }
  std::string text = operation + (*member(event, "granted").boolean() ? " granted" : " refused");
  const Value& error = member(member(event, "error"), "$error");
  if (!error.isNull()) text += " with " + *member(error, "domain").string() + ' ' + writeJson(member(error, "code"));
  return text;
}

}  // namespace

std::string contentOf(const std::filesystem::path& path) {
  std::ifstream file(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(file), {}};
}

std::vector<Value> ReplayRun::results() const {
  std::vector<Value> results;
  std::istringstream lines(output);
  for (std::string line; std::getline(lines, line);) {
    const auto parsed = NlohmannJsonParser(NlohmannJsonParser::greatestDepth).parse(line, JsonFragments::refused);
    EXPECT_TRUE(parsed.value) << line;
    results.push_back(parsed.value.value_or(Value()));
  }
  return results;
}

ReplayRun runReplay(const std::vector<std::string>& arguments, const std::string& input) {
  std::string folderName = (std::filesystem::path(::testing::TempDir()) / "plugin-replay-XXXXXX").string();
  const std::filesystem::path folder = mkdtemp(folderName.data());
  std::ofstream(folder / "in", std::ios::binary) << input;
  std::string command = quoted(PLUGIN_REPLAY);
  for (const std::string& argument : arguments) command += ' ' + quoted(argument);
  command += " <" + quoted(folder / "in") + " >" + quoted(folder / "out") + " 2>" + quoted(folder / "err");
  const int status = std::system(command.c_str());
  ReplayRun run{.exitStatus = WIFEXITED(status) ? WEXITSTATUS(status) : -1,
                .output = contentOf(folder / "out"),
                .errors = contentOf(folder / "err")};
  std::filesystem::remove_all(folder);
  return run;
}

std::vector<std::string> outcomesOf(const Value& result) {
  if (const std::string* error = member(result, "error").string()) return {"error: " + *error};
  if (!member(result, "crash").isNull()) return {"crash " + writeJson(member(result, "crash"))};
  std::vector<std::string> outcomes;
  for (const Value& event : *member(result, "events").array()) {
    const std::string& name = *member(event, "event").string();
    if (name == "completion" || name == "blocked-forever") outcomes.push_back(outcomeOf(event));
  }
  return outcomes;
}

std::vector<Value> eventsOf(const Value& result, const std::string& name) {
  std::vector<Value> found;
  for (const Value& event : *member(result, "events").array()) {
    if (*member(event, "event").string() == name) found.push_back(event);
  }
  return found;
}

}  // namespace palisade
