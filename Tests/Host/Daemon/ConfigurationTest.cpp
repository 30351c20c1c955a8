#include "Host/Daemon/Configuration.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <fstream>
#include <iterator>
#include <optional>
#include <regex>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include "Host/Preferences/TomlFile.h"
#include "Tests/Host/TemporaryFolder.h"

namespace palisade {
namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::Optional;
using testing::SizeIs;
using testing::ThrowsMessage;

CommandLineRequest apply(std::vector<std::string> arguments, DaemonConfiguration& configuration) {
  std::string program = "accountd";
  std::vector<char*> pointers{program.data()};
  for (std::string& argument : arguments) pointers.push_back(argument.data());
  const int count = static_cast<int>(pointers.size());
  pointers.push_back(nullptr);
  return applyCommandLine(count, pointers.data(), configuration);
}

TEST(AConfiguration, HasDefaults) {
  DaemonConfiguration configuration;
  applyConfigurationFile({}, configuration);
  EXPECT_EQ(apply({}, configuration), CommandLineRequest::serve);
  EXPECT_EQ(configuration.plugins, "");
  EXPECT_EQ(configuration.alert, std::nullopt);
  EXPECT_EQ(configuration.terminal, std::nullopt);
  EXPECT_EQ(configuration.keychain, KeychainChoice::automatic);
  EXPECT_EQ(configuration.logLevel, LogLevel::notice);
  EXPECT_EQ(configuration.coolDown.refusals, 3U);
  EXPECT_EQ(configuration.coolDown.length, std::chrono::hours(1));
}

// Each way of saying the same.
std::vector<DaemonConfiguration> configurationsWith(const std::string& name, const std::string& value) {
  std::vector<DaemonConfiguration> configurations(3);
  applyConfigurationFile({{name, value}}, configurations[0]);
  EXPECT_EQ(apply({"--" + name, value}, configurations[1]), CommandLineRequest::serve);
  EXPECT_EQ(apply({"--" + name + "=" + value}, configurations[2]), CommandLineRequest::serve);
  return configurations;
}

TEST(ASetting, IsTakenFromTheFileAndFromTheCommandLine) {
  for (const auto& made : configurationsWith("plugins", "/opt/plug ins")) EXPECT_EQ(made.plugins, "/opt/plug ins");
  for (const auto& made : configurationsWith("terminal", "/dev/pts/3="))
    EXPECT_THAT(made.terminal, Optional(std::string("/dev/pts/3=")));
  for (const auto& made : configurationsWith("display", "localhost:10.0"))
    EXPECT_THAT(made.display, Optional(std::string("localhost:10.0")));
}

TEST(TheAlert, IsOneOfItsWords) {
  for (const auto& [word, expected] : std::vector<std::pair<std::string, AlertFrontEnd>>{{"desktop", AlertFrontEnd::desktop},
                                                                                         {"portal", AlertFrontEnd::portal},
                                                                                         {"terminal", AlertFrontEnd::terminal},
                                                                                         {"nobody", AlertFrontEnd::nobody}}) {
    for (const auto& made : configurationsWith("alert", word)) EXPECT_THAT(made.alert, Optional(expected));
  }
}

TEST(TheKeychain, IsOneOfItsWords) {
  for (const auto& [word, expected] :
       std::vector<std::pair<std::string, KeychainChoice>>{{"automatic", KeychainChoice::automatic},
                                                           {"secret-service", KeychainChoice::secretService},
                                                           {"vault", KeychainChoice::vault}}) {
    for (const auto& made : configurationsWith("keychain", word)) EXPECT_EQ(made.keychain, expected);
  }
}

TEST(TheLogLevel, IsOneOfItsWords) {
  for (const auto& [word, expected] : std::vector<std::pair<std::string, LogLevel>>{
           {"error", LogLevel::error}, {"notice", LogLevel::notice}, {"debug", LogLevel::debug}}) {
    for (const auto& made : configurationsWith("log", word)) EXPECT_EQ(made.logLevel, expected);
  }
}

TEST(TheCoolDown, IsTwoNumbersInTheFile) {
  DaemonConfiguration configuration;
  applyConfigurationFile({{"cool_down_after_refusals", 0}, {"cool_down_minutes", 90}}, configuration);
  EXPECT_EQ(configuration.coolDown.refusals, 0U);
  EXPECT_EQ(configuration.coolDown.length, std::chrono::minutes(90));
}

TEST(TheCoolDown, IsRefusedBeyondItsBounds) {
  struct Case {
    std::string name;
    std::vector<Value> values;
    std::string sentence;
  };
  for (const auto& [name, values, sentence] : std::vector<Case>{
           {"cool_down_after_refusals",
            {-1, 1001, "3", true, 2.5, Array{3}},
            "'cool_down_after_refusals' is to be a whole number from 0 to 1000."},
           {"cool_down_minutes",
            {0, -1, 10081, "60", 1.5, Dictionary()},
            "'cool_down_minutes' is to be a whole number from 1 to 10080."},
       }) {
    for (const Value& value : values) {
      DaemonConfiguration configuration;
      EXPECT_THAT([&] { applyConfigurationFile({{name, value}}, configuration); }, ThrowsMessage<std::runtime_error>(sentence));
    }
  }
}

TEST(AWrongSetting, IsNamedWithWhatIsRight) {
  struct Case {
    std::string name;
    std::string value;
    std::string sentence;
  };
  for (const auto& [name, value, sentence] : std::vector<Case>{
           {"alert", "window", "There is no alert 'window': it is desktop, portal, terminal or nobody."},
           {"alert", "", "There is no alert '': it is desktop, portal, terminal or nobody."},
           {"keychain", "Vault", "There is no keychain 'Vault': it is automatic, secret-service or vault."},
           {"log", "all", "There is no log level 'all': it is error, notice or debug."},
           {"colour", "red", "There is no setting 'colour'."},
           {"", "red", "There is no setting ''."},
       }) {
    DaemonConfiguration configuration;
    EXPECT_THAT([&] { applyConfigurationFile({{name, value}}, configuration); }, ThrowsMessage<std::runtime_error>(sentence));
    EXPECT_THAT([&] { apply({"--" + name, value}, configuration); }, ThrowsMessage<std::runtime_error>(sentence));
  }
}

TEST(AWord, IsATextInTheFile) {
  for (const char* name : {"plugins", "alert", "terminal", "display", "keychain", "log"}) {
    for (const Value& value : std::vector<Value>{1, true, Array{"desktop"}, Dictionary()}) {
      DaemonConfiguration configuration;
      EXPECT_THAT(
          [&] {
            applyConfigurationFile({{name, value}}, configuration);
          },
          ThrowsMessage<std::runtime_error>(AllOf(HasSubstr("'" + std::string(name) + "'"), HasSubstr("in quotes"))));
    }
  }
}

TEST(TheCommandLine, GoesOverTheFile) {
  DaemonConfiguration configuration;
  applyConfigurationFile({{"log", "debug"}, {"keychain", "vault"}}, configuration);
  apply({"--log", "error"}, configuration);
  EXPECT_EQ(configuration.logLevel, LogLevel::error);
  EXPECT_EQ(configuration.keychain, KeychainChoice::vault);
}

TEST(TheCommandLine, AsksForHelpOrTheVersion) {
  DaemonConfiguration configuration;
  EXPECT_EQ(apply({"-h"}, configuration), CommandLineRequest::help);
  EXPECT_EQ(apply({"--log", "debug", "--help"}, configuration), CommandLineRequest::help);
  EXPECT_EQ(apply({"--version"}, configuration), CommandLineRequest::version);
}

TEST(TheCommandLine, IsRefusedWhereItIsWrong) {
  for (const auto& [arguments, part] : std::vector<std::pair<std::vector<std::string>, std::string>>{
           {{"serve"}, "'serve' is no option"}, {{"-x"}, "'-x' is no option"}, {{"--log"}, "--log needs a value"}}) {
    DaemonConfiguration configuration;
    const auto start = [&, given = arguments] { apply(given, configuration); };
    EXPECT_THAT(start, ThrowsMessage<std::runtime_error>(AllOf(HasSubstr(part), HasSubstr("Try --help."))));
  }
}

TEST(TheFileThatIsInstalled, ShowsEverySettingAsItCanBeWritten) {
  std::ifstream file(SETTINGS_FILE);
  const std::string text(std::istreambuf_iterator<char>(file), {});
  const TemporaryFolder folder;
  const auto uncommented = folder.path() / "accountd.toml";
  // A setting's line has no space behind its "#", a remark's has.
  std::ofstream(uncommented) << std::regex_replace(text, std::regex("(^|\n)#(?=[a-z])"), "$1");

  const std::optional<Dictionary> table = readTomlFile(uncommented);
  ASSERT_TRUE(table);
  EXPECT_THAT(*table, SizeIs(8));
  DaemonConfiguration configuration;
  EXPECT_NO_THROW(applyConfigurationFile(*table, configuration));
}

}  // namespace
}  // namespace palisade
