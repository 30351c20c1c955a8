#include "Host/Vantad/VantadOptions.h"

#include <getopt.h>

#include <cstdlib>
#include <stdexcept>

namespace palisade {
namespace {

constexpr const char* help = R"(Usage: vantad [OPTION...]

The social daemon: asks the Facebook server to make tokens invalid whose clients have lost their access, and asks again until
the server has confirmed it. It runs until SIGTERM or SIGINT, one process for each state directory.

  --state DIRECTORY        where the outbox and the vault are (default: $XDG_STATE_HOME/palisade, else ~/.local/state/palisade)
  --configuration FILE     where the server is (default: $XDG_CONFIG_HOME/palisade/server.toml, else under ~/.config)
  --keychain CHOICE        automatic, secret-service or vault (default: automatic)
  --verbose                log debug records too
  --help                   this text

server.toml needs one line, address = "https://HOST"; it is read again whenever it changes.
)";

std::filesystem::path folderFrom(const char* variable, const char* underHome) {
  const char* const folder = std::getenv(variable);
  if (folder != nullptr && *folder == '/') return std::filesystem::path(folder) / "palisade";
  const char* const home = std::getenv("HOME");
  if (home == nullptr || *home != '/') throw std::invalid_argument("There is no home directory: set HOME, or name every path.");
  return std::filesystem::path(home) / underHome / "palisade";
}

KeychainChoice choiceFrom(const std::string& name) {
  if (const auto choice = keychainChoiceNamed(name)) return *choice;
  throw std::invalid_argument("\"" + name + "\" is no keychain; choose automatic, secret-service or vault.");
}

std::filesystem::path absolutePath(const char* path) { return std::filesystem::absolute(path).lexically_normal(); }

}  // namespace

KeychainOptions VantadOptions::keychainOptions() const {
  const char* const credentials = std::getenv("CREDENTIALS_DIRECTORY");
  return {
      .choice = keychain,
      .vault = {.path = state / "vault.sqlite",
                .keyFile = state / "vault.key",
                .credentialsFolder = credentials == nullptr ? std::nullopt : std::optional<std::filesystem::path>(credentials)},
      .choiceFile = state / "keychain"};
}

VantadOptions parseVantadOptions(int count, char** words) {
  static constexpr option known[] = {
      {"help", no_argument, nullptr, 'h'},           {"verbose", no_argument, nullptr, 'v'},
      {"state", required_argument, nullptr, 's'},    {"configuration", required_argument, nullptr, 'c'},
      {"keychain", required_argument, nullptr, 'k'}, {nullptr, 0, nullptr, 0}};
  VantadOptions options;
  opterr = 0;
  for (int letter = 0; (letter = getopt_long(count, words, "h", known, nullptr)) != -1;) {
    switch (letter) {
      case 'h': options.wantsHelp = true; return options;
      case 'v': options.isVerbose = true; break;
      case 's': options.state = absolutePath(optarg); break;
      case 'c': options.configuration = absolutePath(optarg); break;
      case 'k': options.keychain = choiceFrom(optarg); break;
      default:
        throw std::invalid_argument("There is no such option, or it lacks its value: " + std::string(words[optind - 1]) + ".");
    }
  }
  if (optind < count) throw std::invalid_argument("A word too many: " + std::string(words[optind]) + ".");
  if (options.state.empty()) options.state = folderFrom("XDG_STATE_HOME", ".local/state");
  if (options.configuration.empty()) options.configuration = folderFrom("XDG_CONFIG_HOME", ".config") / "server.toml";
  return options;
}

std::string vantadHelp() { return help; }

}  // namespace palisade
