#include "Host/Daemon/Configuration.h"

#include <stdexcept>
#include <string_view>

namespace palisade {

const char* const daemonHelp = R"(Usage: accountd [OPTION...]

Owns a user's accounts and decides, with its plug-ins, which applications may use them. Started by the session bus when it is first
called; see com.veltran.Accounts1 there, and palisade(1) for people.

  --plugins DIRECTORY   load the plug-ins in this folder
  --alert FRONT-END     desktop, portal, terminal or nobody; otherwise whatever the session has
  --terminal TTY        ask the user on this terminal, such as the one that `tty` prints
  --display NAME        the X display that may be reached over the network, such as localhost:10.0; otherwise none
  --keychain CHOICE     automatic, secret-service or vault
  --log LEVEL           error, notice or debug
  -h, --help            show this
  --version             show the version

The same names can stand in accountd.toml in $XDG_CONFIG_HOME/palisade, or in /etc/xdg/palisade for everybody: keychain = "vault"
accountd.toml(5) describes them, and some more.
The server's address stands in server.toml beside it.
)";

namespace {

constexpr std::int64_t mostRefusals = 1000;
constexpr std::int64_t minutesOfAWeek = 7 * 24 * 60;

KeychainChoice keychainChoice(std::string_view word) {
  if (const auto choice = keychainChoiceNamed(word)) return *choice;
  throw std::runtime_error("There is no keychain '" + std::string(word) + "': it is automatic, secret-service or vault.");
}

AlertFrontEnd alertFrontEnd(std::string_view word) {
  if (const auto choice = alertFrontEndNamed(word)) return *choice;
  throw std::runtime_error("There is no alert '" + std::string(word) + "': it is desktop, portal, terminal or nobody.");
}

LogLevel logLevel(std::string_view word) {
  if (word == "error") return LogLevel::error;
  if (word == "notice") return LogLevel::notice;
  if (word == "debug") return LogLevel::debug;
  throw std::runtime_error("There is no log level '" + std::string(word) + "': it is error, notice or debug.");
}

void apply(std::string_view name, const std::string& value, DaemonConfiguration& configuration) {
  if (name == "plugins") {
    configuration.plugins = value;
  } else if (name == "alert") {
    configuration.alert = alertFrontEnd(value);
  } else if (name == "terminal") {
    configuration.terminal = value;
  } else if (name == "display") {
    configuration.display = value;
  } else if (name == "keychain") {
    configuration.keychain = keychainChoice(value);
  } else if (name == "log") {
    configuration.logLevel = logLevel(value);
  } else {
    throw std::runtime_error("There is no setting '" + std::string(name) + "'.");
  }
}

std::int64_t wholeNumber(std::string_view name, const Value& value, std::int64_t least, std::int64_t most) {
  if (value.integer() == nullptr || *value.integer() < least || *value.integer() > most) {
    throw std::runtime_error("'" + std::string(name) + "' is to be a whole number from " + std::to_string(least) + " to " +
                             std::to_string(most) + ".");
  }
  return *value.integer();
}

// Whether the name is a number's; numbers stand in the file only.
bool applyNumber(std::string_view name, const Value& value, DaemonConfiguration& configuration) {
  if (name == "cool_down_after_refusals") {
    configuration.coolDown.refusals = static_cast<unsigned>(wholeNumber(name, value, 0, mostRefusals));
  } else if (name == "cool_down_minutes") {
    configuration.coolDown.length = std::chrono::minutes(wholeNumber(name, value, 1, minutesOfAWeek));
  } else {
    return false;
  }
  return true;
}

}  // namespace

void applyConfigurationFile(const Dictionary& table, DaemonConfiguration& configuration) {
  for (const auto& [name, value] : table) {
    if (applyNumber(name, value, configuration)) continue;
    if (value.string() == nullptr) throw std::runtime_error("'" + name + "' is to be a text in quotes.");
    apply(name, *value.string(), configuration);
  }
}

CommandLineRequest applyCommandLine(int argumentCount, char** arguments, DaemonConfiguration& configuration) {
  for (int index = 1; index < argumentCount; ++index) {
    const std::string_view argument = arguments[index];
    if (argument == "-h" || argument == "--help") return CommandLineRequest::help;
    if (argument == "--version") return CommandLineRequest::version;
    if (!argument.starts_with("--")) throw std::runtime_error("'" + std::string(argument) + "' is no option. Try --help.");
    const std::size_t equals = argument.find('=');
    if (equals != std::string_view::npos) {
      apply(argument.substr(2, equals - 2), std::string(argument.substr(equals + 1)), configuration);
    } else if (index + 1 < argumentCount) {
      apply(argument.substr(2), arguments[++index], configuration);
    } else {
      throw std::runtime_error("The option " + std::string(argument) + " needs a value. Try --help.");
    }
  }
  return CommandLineRequest::serve;
}

}  // namespace palisade
