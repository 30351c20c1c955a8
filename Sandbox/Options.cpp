#include "Sandbox/Options.h"

#include <getopt.h>

#include <algorithm>
#include <charconv>
#include <cstdlib>
#include <stdexcept>

#include "Sandbox/Faults.h"

namespace palisade::sandbox {
namespace {

constexpr const char* usage = R"(Usage: palisade-sandbox [serve] [OPTION...]
       palisade-sandbox tokens|requests|faults|calm [--directory DIRECTORY]
       palisade-sandbox fault FAULT [OPTION...]

A Facebook server for trials and tests, on this machine only. Its tokens are worth nothing anywhere else.

  serve     run the server until SIGTERM or SIGINT (the default)
  tokens    show the tokens that it issued
  requests  show what it was asked
  faults    show how it will fail
  fault     make it fail the next time
  calm      make it stop failing

Each command finds the server through its directory:
  --directory DIRECTORY      (default: $XDG_RUNTIME_DIR/palisade-sandbox, else /tmp/palisade-sandbox-UID)

When the server is ready it prints one line, "ADDRESS CONTROL-ADDRESS CA-FILE", also to be found in DIRECTORY/address.
DIRECTORY/control-secret lets its reader ask the control server, and is its owner's alone, like everything in DIRECTORY.
DIRECTORY/master-token holds the token that an account signs its requests with, DIRECTORY/ca.pem the authority to trust.
Both stay the same from one start to the next; issued tokens are forgotten.

Options of serve:
  --port PORT                listen there (default: any free port)
  --configuration FILE       write a server.toml there that makes the daemons use this server
  --permissions FILE         know these permissions instead of the usual ones: one a line, its name and, after a blank,
                             the words for it; permissions without words cannot be described
  --certificate KIND         prove its identity badly:
)";

constexpr const char* faultOptions = R"(
Options of fault:
  --times N                  how many requests fail (default: 1; 0: all until "calm")
  --path PATH                fail at this path only, /oauth/authorization say
  --bytes N  --milliseconds N  --status N  --location URL  --retry-after SECONDS-OR-DATE

To watch a client that meets a busy server:
  palisade-sandbox &
  palisade-sandbox fault unavailable --retry-after 30 --times 2
)";

std::filesystem::path defaultFolder() {
  const char* const runtimeFolder = std::getenv("XDG_RUNTIME_DIR");
  if (runtimeFolder != nullptr && *runtimeFolder == '/') return std::filesystem::path(runtimeFolder) / "palisade-sandbox";
  return "/tmp/palisade-sandbox-" + std::to_string(getuid());
}

Command commandNamed(const std::string& name) {
  static constexpr std::pair<const char*, Command> commands[] = {
      {"help", Command::help},     {"serve", Command::serve}, {"tokens", Command::tokens}, {"requests", Command::requests},
      {"faults", Command::faults}, {"fault", Command::fault}, {"calm", Command::calm}};
  for (const auto& [known, command] : commands) {
    if (name == known) return command;
  }
  throw std::invalid_argument("There is no command called \"" + name + "\".");
}

int portFrom(const std::string& text) {
  int port = -1;
  const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), port);
  if (error != std::errc() || end != text.data() + text.size() || port < 0 || port > 65535) {
    throw std::invalid_argument("A port is a number from 0 to 65535, not \"" + text + "\".");
  }
  return port;
}

CertificateKind certificateFrom(const std::string& name) {
  if (const auto kind = certificateKindNamed(name)) return *kind;
  throw std::invalid_argument("There is no kind of certificate called \"" + name + "\".");
}

constexpr option longOptions[] = {{"help", no_argument, nullptr, 'h'},
                                  {"directory", required_argument, nullptr, 'd'},
                                  {"port", required_argument, nullptr, 'p'},
                                  {"configuration", required_argument, nullptr, 'c'},
                                  {"permissions", required_argument, nullptr, 'P'},
                                  {"certificate", required_argument, nullptr, 'C'},
                                  {"times", required_argument, nullptr, 'f'},
                                  {"path", required_argument, nullptr, 'f'},
                                  {"bytes", required_argument, nullptr, 'f'},
                                  {"milliseconds", required_argument, nullptr, 'f'},
                                  {"status", required_argument, nullptr, 'f'},
                                  {"location", required_argument, nullptr, 'f'},
                                  {"retry-after", required_argument, nullptr, 'f'},
                                  {nullptr, 0, nullptr, 0}};

void takeOption(Options& options, int letter, const std::string& name, const std::string& value) {
  switch (letter) {
    case 'h': options.command = Command::help; break;
    case 'd': options.folder = value; break;
    case 'p': options.port = portFrom(value); break;
    case 'c': options.configuration = value; break;
    case 'P': options.permissions = value; break;
    case 'C': options.certificate = certificateFrom(value); break;
    case 'f': {
      std::string fieldName = name;
      std::replace(fieldName.begin(), fieldName.end(), '-', '_');
      options.fault.emplace_back(std::move(fieldName), value);
      break;
    }
    default: throw std::invalid_argument("There is no option \"" + name + "\", or it lacks its value.");
  }
}

}  // namespace

Options parseOptions(int count, char** words) {
  Options options = {.folder = defaultFolder(), .permissions = {}, .configuration = {}, .fault = {}};
  opterr = 0;
  int index = 0;
  while (true) {
    const int position = optind;
    const int letter = getopt_long(count, words, "hd:", longOptions, &index);
    if (letter == -1) break;
    takeOption(options, letter, letter == '?' ? words[position] : longOptions[index].name, optarg == nullptr ? "" : optarg);
  }
  std::vector<std::string> rest(words + optind, words + count);
  if (options.command == Command::help || rest.empty()) return options;

  options.command = commandNamed(rest.front());
  if (options.command == Command::fault && rest.size() == 2) {
    options.fault.emplace_back("kind", rest.back());
  } else if (options.command == Command::fault || rest.size() > 1) {
    throw std::invalid_argument(options.command == Command::fault ? "Name one fault."
                                                                  : "A word too many: " + rest.back() + ".");
  }
  return options;
}

std::string helpText() {
  std::string text = usage;
  const auto list = [&text](std::string_view name, std::string_view explanation) {
    constexpr std::size_t column = 20;
    text += "      " + std::string(name) + std::string(column - std::min(name.size(), column), ' ') + std::string(explanation) +
            "\n";
  };
  for (const CertificateKindName& kind : certificateKinds()) list(kind.name, kind.explanation);
  text += "\nFaults:\n";
  for (const FaultKindName& kind : faultKinds()) list(kind.name, kind.explanation);
  return text + faultOptions;
}

}  // namespace palisade::sandbox
