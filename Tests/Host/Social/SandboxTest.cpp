#include "Tests/Host/Social/Sandbox.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fstream>
#include <sstream>

#include "Host/Preferences/TomlFile.h"
#include "Host/Social/FacebookServer.h"
#include "Host/Social/ServerConfiguration.h"

// The sandbox as its users meet it.

using namespace palisade;
using testing::AllOf;
using testing::HasSubstr;

namespace {

struct Output {
  int status;
  std::string text;
};

// Runs one of its commands to the end: what it prints, errors included.
Output run(const std::vector<std::string>& arguments) {
  TemporaryFolder folder;
  ChildProcess process({.program = SANDBOX_PROGRAM, .arguments = arguments, .log = folder.path() / "errors"});
  std::string text;
  while (const auto line = process.readLine()) text += *line + "\n";
  const int status = process.wait();
  std::ostringstream errors;
  errors << std::ifstream(folder.path() / "errors").rdbuf();
  return {status, text + errors.str()};
}

Output runAt(const Sandbox& sandbox, std::vector<std::string> arguments) {
  arguments.insert(arguments.end(), {"--directory", sandbox.folder().string()});
  return run(arguments);
}

TEST(TheSandbox, ExplainsItself) {
  const Output output = run({"--help"});
  EXPECT_EQ(output.status, 0);
  EXPECT_THAT(output.text,
              AllOf(HasSubstr("master-token"), HasSubstr("unavailable"), HasSubstr("expired"), HasSubstr("--retry-after")));
}

TEST(TheSandbox, ShowsItsTokensAndRequestsAndFailsWhenItIsTold) {
  Sandbox sandbox;
  HttpClient http(sandbox.trusted());
  ServerConfiguration configuration;
  configuration.address = sandbox.address();
  const FacebookServer server(configuration);
  answerOf(ask(http, server.authorization("the-app", "org.example.App", nullptr, std::nullopt, sandbox.masterToken())));
  EXPECT_THAT(runAt(sandbox, {"tokens"}).text, HasSubstr("the-app"));
  EXPECT_THAT(runAt(sandbox, {"requests"}).text, HasSubstr("/oauth/authorization"));

  EXPECT_EQ(runAt(sandbox, {"fault", "unavailable", "--retry-after", "30", "--times", "2", "--path", "/me"}).status, 0);
  EXPECT_THAT(runAt(sandbox, {"faults"}).text, HasSubstr(R"({"kind":"unavailable","path":"/me","times":2})"));
  EXPECT_EQ(answerOf(ask(http, meRequest(sandbox))).statusCode, 503);
  EXPECT_EQ(runAt(sandbox, {"calm"}).text, "[]\n");
  EXPECT_EQ(answerOf(ask(http, meRequest(sandbox))).statusCode, 401);
}

TEST(TheSandbox, IsControlledByItsOwnerAlone) {
  Sandbox sandbox;
  HttpClient http(sandbox.trusted());
  for (const auto& secret :
       {std::optional<std::string>(), std::optional<std::string>("wrong"), std::optional(sandbox.masterToken())}) {
    for (const char* path : {"/tokens", "/requests", "/faults"}) {
      const HttpAnswer answer = answerOf(ask(http, {.url = sandbox.controlAddress() + path, .bearerToken = secret}));
      EXPECT_EQ(answer.statusCode, 403) << path;
    }
    for (const char* path : {"/faults", "/calm"}) {
      const HttpAnswer answer =
          answerOf(ask(http, {.url = sandbox.controlAddress() + path, .bearerToken = secret, .form = "kind=silent"}));
      EXPECT_EQ(answer.statusCode, 403) << path;
    }
  }
  EXPECT_EQ(runAt(sandbox, {"faults"}).text, "[]\n");
  for (const auto& file : std::filesystem::directory_iterator(sandbox.folder())) {
    if (file.path().filename() == "log") continue;
    const auto others = std::filesystem::perms::group_all | std::filesystem::perms::others_all;
    EXPECT_EQ(file.status().permissions() & others, std::filesystem::perms::none) << file.path();
  }
}

TEST(TheSandbox, AddsUpWhatAnAppMayDo) {
  Sandbox sandbox;
  HttpClient http(sandbox.trusted());
  ServerConfiguration configuration;
  configuration.address = sandbox.address();
  const FacebookServer server(configuration);
  const auto authorize = [&](const char* permission) {
    const auto permissions = std::make_shared<const PermissionSet>(PermissionSet{permission});
    return answerOf(ask(http, server.authorization("app", "org.example.App", permissions, std::nullopt, sandbox.masterToken())))
        .body;
  };
  EXPECT_THAT(authorize("email"), HasSubstr(R"(["email"])"));
  EXPECT_THAT(authorize("user_likes"), HasSubstr(R"(["email","user_likes"])"));
}

TEST(TheSandbox, WritesAConfigurationThatTheDaemonsRead) {
  TemporaryFolder folder;
  const auto file = folder.path() / "server.toml";
  Sandbox sandbox({"--configuration", file.string()});
  const ServerConfiguration configuration(readTomlFile(file).value());
  HttpClient http(configuration.httpOptions());
  EXPECT_EQ(configuration.address, sandbox.address());
  EXPECT_EQ(answerOf(ask(http, meRequest(sandbox))).statusCode, 401);
}

TEST(TheSandbox, KnowsThePermissionsOfAFile) {
  TemporaryFolder folder;
  const auto file = folder.path() / "permissions";
  std::ofstream(file) << "# a comment\n\nplain\ndescribed  the things that you keep\n";
  Sandbox sandbox({"--permissions", file.string()});
  HttpClient http(sandbox.trusted());
  ServerConfiguration configuration;
  configuration.address = sandbox.address();
  const FacebookServer server(configuration);
  const auto describe = [&](const char* name) {
    const auto permissions = std::make_shared<const PermissionSet>(PermissionSet{name});
    return answerOf(ask(http, server.description(permissions, std::nullopt, sandbox.masterToken()))).body;
  };
  EXPECT_EQ(describe("described"), R"("the things that you keep")");
  EXPECT_EQ(describe("plain"), R"("API_EC_PARAM")");
  EXPECT_EQ(describe("email"), R"("API_EC_PARAM")");
}

TEST(TheSandbox, KeepsItsAuthorityAndMasterTokenThroughARestart) {
  Sandbox sandbox;
  const std::string address = sandbox.address();
  const std::string token = sandbox.masterToken();
  HttpClient http(sandbox.trusted());
  EXPECT_EQ(answerOf(ask(http, meRequest(sandbox))).statusCode, 401);
  sandbox.stop();
  sandbox.restart();
  EXPECT_EQ(sandbox.address(), address);
  EXPECT_EQ(sandbox.masterToken(), token);
  EXPECT_EQ(answerOf(ask(http, meRequest(sandbox))).statusCode, 401);
}

struct Mistake {
  std::string name;
  std::vector<std::string> arguments;
  std::string message;
};
void PrintTo(const Mistake& mistake, std::ostream* stream) { *stream << mistake.name; }

class AMistake : public testing::TestWithParam<Mistake> {};

TEST_P(AMistake, IsAnErrorThatSaysWhat) {
  const Output output = run(GetParam().arguments);
  EXPECT_EQ(output.status, 2);
  EXPECT_THAT(output.text, HasSubstr(GetParam().message));
}

INSTANTIATE_TEST_SUITE_P(
    Table, AMistake,
    testing::Values(Mistake{"unknownOption", {"--frob"}, "--frob"}, Mistake{"missingValue", {"--port"}, "--port"},
                    Mistake{"unknownCommand", {"frob"}, "\"frob\""}, Mistake{"aWordTooMany", {"tokens", "all"}, "all"},
                    Mistake{"noFault", {"fault"}, "Name one fault"}, Mistake{"badPort", {"--port", "high"}, "\"high\""},
                    Mistake{"badCertificate", {"--certificate", "nice"}, "\"nice\""},
                    Mistake{"nothingRunning", {"tokens", "--directory", "/nowhere"}, "palisade-sandbox --directory /nowhere"}),
    [](const auto& test) { return test.param.name; });

TEST(AListOfPermissionsThatIsMissing, IsAnErrorThatNamesIt) {
  TemporaryFolder folder;
  const Output output = run({"--permissions", "/nowhere/list", "--directory", folder.path().string()});
  EXPECT_EQ(output.status, 2);
  EXPECT_THAT(output.text, HasSubstr("/nowhere/list"));
}

TEST(AFaultThatDoesNotExist, IsRefused) {
  Sandbox sandbox;
  const Output output = runAt(sandbox, {"fault", "frob"});
  EXPECT_EQ(output.status, 2);
  EXPECT_THAT(output.text, HasSubstr("unknown_fault"));
}

TEST(APortThatIsTaken, IsAnError) {
  Sandbox sandbox;
  TemporaryFolder folder;
  const Output output = run({"--port", sandbox.port(), "--directory", folder.path().string()});
  EXPECT_EQ(output.status, 2);
  EXPECT_THAT(output.text, HasSubstr(sandbox.port()));
}

}  // namespace
