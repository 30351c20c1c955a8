#include "Host/Vantad/VantadOptions.h"

#include <getopt.h>

#include <cstdlib>
#include <stdexcept>

#include "Host/Daemon/Paths.h"

namespace palisade {
namespace {

constexpr const char* help = R"(Usage: vantad [OPTION...]

The social daemon: asks the Facebook server to make tokens invalid whose clients have lost their access, and asks again until
the server has confirmed it. It runs until SIGTERM or SIGINT, or the end of the session, one process
for each state directory; the account daemon has the session bus start it when there is something to do.

  --state DIRECTORY       where the outbox and the vault are (default: $XDG_STATE_HOME/palisade, else ~/.local/state/palisade)
  --configuration FILE    where the server is (default: $XDG_CONFIG_HOME/palisade/server.toml, else the administrator's, in
                          /etc/xdg/palisade)
  --keychain CHOICE       automatic, secret-service or vault
  --log LEVEL             error, notice or debug
  -h, --help              show this
  --version               show the version

What --keychain and --log leave open is taken from accountd.toml, found likewise. server.toml needs one line,
address = "https://HOST"; it is read again whenever it changes.
)";

KeychainChoice keychainFrom(const std::string& name) {
  if (const auto choice = keychainChoiceNamed(name)) return *choice;
  throw std::invalid_argument("There is no keychain \"" + name + "\": it is automatic, secret-service or vault.");
}

LogLevel logLevelFrom(const std::string& name) {
  if (name == "error") return LogLevel::error;
  if (name == "notice") return LogLevel::notice;
  if (name == "debug") return LogLevel::debug;
  throw std::invalid_argument("There is no log level \"" + name + "\": it is error, notice or debug.");
}

std::filesystem::path absolutePath(const char* path) { return std::filesystem::absolute(path).lexically_normal(); }

const std::string* textIn(const Dictionary& table, std::string_view key) {
  const Value* const value = table.find(key);
  return value == nullptr ? nullptr : value->string();
}

}  // namespace

void VantadOptions::takeDefaultsFrom(const Dictionary& accountdTable) {
  const std::string* const keychainName = textIn(accountdTable, "keychain");
  if (!keychain && keychainName != nullptr) keychain = keychainFrom(*keychainName);
  const std::string* const levelName = textIn(accountdTable, "log");
  if (!logLevel && levelName != nullptr) logLevel = logLevelFrom(*levelName);
}

VaultOptions VantadOptions::vaultOptions() const {
  const char* const credentials = std::getenv("CREDENTIALS_DIRECTORY");
  return {.choice = keychain.value_or(KeychainChoice::automatic),
          .path = state / "vault.sqlite",
          .keyFile = state / "vault.key",
          .credentialsFolder = credentials == nullptr ? std::nullopt : std::optional<std::filesystem::path>(credentials)};
}

VantadOptions parseVantadOptions(int count, char** words) {
  static constexpr option known[] = {{"help", no_argument, nullptr, 'h'},
                                     {"version", no_argument, nullptr, 'v'},
                                     {"state", required_argument, nullptr, 's'},
                                     {"configuration", required_argument, nullptr, 'c'},
                                     {"keychain", required_argument, nullptr, 'k'},
                                     {"log", required_argument, nullptr, 'l'},
                                     {nullptr, 0, nullptr, 0}};
  VantadOptions options;
  opterr = 0;
  for (int letter = 0; (letter = getopt_long(count, words, "h", known, nullptr)) != -1;) {
    switch (letter) {
      case 'h': options.request = VantadOptions::Request::help; return options;
      case 'v': options.request = VantadOptions::Request::version; return options;
      case 's': options.state = absolutePath(optarg); break;
      case 'c': options.configuration = absolutePath(optarg); break;
      case 'k': options.keychain = keychainFrom(optarg); break;
      case 'l': options.logLevel = logLevelFrom(optarg); break;
      default:
        throw std::invalid_argument("There is no such option, or it lacks its value: " + std::string(words[optind - 1]) + ".");
    }
  }
  if (optind < count) throw std::invalid_argument("A word too many: " + std::string(words[optind]) + ".");
  if (options.state.empty()) options.state = stateFolder();
  if (options.configuration.empty()) {
    options.configuration = configurationFile("server.toml");
    options.accountdConfiguration = configurationFile("accountd.toml");
  } else {
    options.accountdConfiguration = options.configuration.parent_path() / "accountd.toml";
  }
  return options;
}

std::string vantadHelp() { return help; }

}  // namespace palisade
