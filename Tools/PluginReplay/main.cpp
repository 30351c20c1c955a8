// plugin-replay: carries out scenarios against a plug-in module on a scripted platform and prints what happened.

#include <algorithm>
#include <exception>
#include <filesystem>
#include <fstream>
#include <iostream>
#include <iterator>
#include <memory>
#include <stdexcept>
#include <string>
#include <thread>

#include <unistd.h>
#include <CLI/App.hpp>
#include <CLI/Config.hpp>
#include <CLI/Formatter.hpp>

#include "Host/Daemon/PluginLoader.h"
#include "Host/Json/Json.h"
#include "Host/Strings/GettextStringTable.h"
#include "Tools/PluginReplay/BatchRunner.h"
#include "Tools/PluginReplay/ScenarioReader.h"
#include "Tools/PluginReplay/ScenarioRunner.h"
#include "Tools/PluginReplay/TraceWriter.h"

namespace palisade {
namespace {

constexpr int exitCarriedOut = 0;
constexpr int exitCrashed = 1;
constexpr int exitMalformed = 2;

constexpr const char* purpose =
    "Carries out scenarios against a plug-in module on a scripted platform and prints what\n"
    "happened, in order: every call that the plug-in made, every answer that it got, and how\n"
    "each operation ended. Nothing outside the process is touched: no account, no keychain,\n"
    "no server.";

constexpr const char* furtherHelp = R"(
A scenario is a JSON object; only "operations" has to be there:

  {"id": "first consent",
   "clients": {"photos": {"bundleID": "org.example.photos", "appName": "Photos"}},
   "accounts": [{"id": "me", "type": "AccountTypeIdentifierFacebook"}],
   "keychain": [{"account": "me", "clientID": null, "oauthToken": "MASTER"}],
   "alert": {"word": 0},
   "server": {"authorization": [{"body": "{\"access_token\": \"T\", \"permissions\": [\"email\"]}"}]},
   "operations": [{"name": "handleAccessRequest", "client": "photos",
                   "options": {"FacebookAppIdKey": "42", "FacebookPermissionsKey": ["email"]}}]}

Save it as first-consent.json and say:

  plugin-replay --module VXFacebookAccountAccessPlugin.so first-consent.json

The answer is {"scenario": ID, "events": [...]} on one line; {"scenario": ID, "error": TEXT} for a
scenario that is not of the form; {"scenario": ID, "crash": SIGNAL} when the plug-in crashed.

Exit status: 0 everything was carried out, 1 a plug-in crashed, 2 a scenario was not of the form,
or the module or the scenarios could not be read.)";

struct Arguments {
  std::filesystem::path module;
  std::string language = "en";
  bool lines = false;
  std::filesystem::path scenario;
};

std::string contentOf(const std::filesystem::path& path) {
  std::ifstream file(path, std::ios::binary);
  if (!file || std::filesystem::is_directory(path)) throw std::runtime_error(path.string() + " cannot be read");
  return {std::istreambuf_iterator<char>(file), {}};
}

ScenarioResult carryOut(const std::string& text, const AnnounceID& announceID, const AccountAccessPluginModule& module,
                        const std::shared_ptr<const StringTable>& strings) {
  const auto malformed = [](const std::optional<std::string>& id, const std::string& problem) {
    return ScenarioResult{.line = writeScenarioError(id, problem), .outcome = ScenarioOutcome::malformed};
  };
  // A scenario may ask what a plug-in makes of U+0000.
  const NlohmannJsonParser parser(NlohmannJsonParser::greatestDepth);
  const auto parsed = parser.parse(text, JsonFragments::allowed);
  if (!parsed.value) {
    announceID(std::nullopt);
    return malformed(std::nullopt, "the scenario cannot be read: " + parsed.error->description.value_or("it is not JSON"));
  }
  const auto id = scenarioID(*parsed.value);
  announceID(id);
  try {
    const Scenario scenario = readScenario(*parsed.value);
    return {.line = writeTrace(id, runScenario(scenario, module, strings)), .outcome = ScenarioOutcome::carriedOut};
  } catch (const std::exception& problem) {
    return malformed(id, problem.what());
  }
}

ScenarioOutcome runOne(const std::filesystem::path& path, const CarryOut& carry) {
  ScenarioProcess process(contentOf(path), carry);
  while (!process.hasEnded()) process.advance();
  std::cout << process.result().line << std::endl;
  return process.result().outcome;
}

int run(const Arguments& arguments) {
  const LoadedPlugin loaded = loadPlugin(arguments.module);
  const auto strings = std::make_shared<const GettextStringTable>(loaded.path.parent_path() / "Resources", arguments.language);
  // Read the texts now, so that not every scenario's process reads them anew.
  strings->localizedString("", "", "Localizable");
  const CarryOut carry = [&](const std::string& text, const AnnounceID& announceID) {
    return carryOut(text, announceID, *loaded.module, strings);
  };
  const std::size_t atOnce = std::max(2U, std::thread::hardware_concurrency());
  const ScenarioOutcome outcome =
      arguments.lines ? runBatch(STDIN_FILENO, std::cout, atOnce, carry) : runOne(arguments.scenario, carry);
  if (!std::cout) throw std::runtime_error("the results cannot be written");
  switch (outcome) {
    case ScenarioOutcome::carriedOut: break;
    case ScenarioOutcome::crashed: return exitCrashed;
    case ScenarioOutcome::malformed: return exitMalformed;
  }
  return exitCarriedOut;
}

int runCommandLine(int argumentCount, char** argumentValues) {
  Arguments arguments;
  CLI::App app{purpose, "plugin-replay"};
  app.footer(furtherHelp);
  app.add_option("--module", arguments.module, "The plug-in module; its texts lie in Resources beside it")
      ->type_name("FILE.so")
      ->required();
  app.add_option("--strings", arguments.language, "The user's language, \"de\" or \"pt_BR\"; English if left out")
      ->type_name("LANGUAGE");
  auto* const lines = app.add_flag("--lines", arguments.lines,
                                   "Read one scenario a line from the standard input and print one result a line, in the\n"
                                   "same order; several are carried out at once, each in a process of its own");
  auto* const scenario =
      app.add_option("SCENARIO", arguments.scenario, "The file of one scenario")->type_name("")->excludes(lines);
  try {
    app.parse(argumentCount, argumentValues);
    if (!arguments.lines && scenario->empty()) throw CLI::RequiredError("SCENARIO.json or --lines");
  } catch (const CLI::CallForHelp& help) {
    app.exit(help);
    return exitCarriedOut;
  } catch (const CLI::ParseError& mistake) {
    throw std::runtime_error(std::string(mistake.what()) + "; plugin-replay --help tells more");
  }
  return run(arguments);
}

}  // namespace
}  // namespace palisade

int main(int argumentCount, char** argumentValues) {
  try {
    return palisade::runCommandLine(argumentCount, argumentValues);
  } catch (const std::exception& problem) {
    std::cerr << "plugin-replay: " << problem.what() << '\n';
    return palisade::exitMalformed;
  }
}
