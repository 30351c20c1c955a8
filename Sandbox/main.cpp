// palisade-sandbox: a Facebook server on this machine, for whoever tries the daemons out and for the tests.

#include <sys/stat.h>
#include <unistd.h>

#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <string>

#include "Sandbox/ControlClient.h"
#include "Sandbox/Options.h"
#include "Sandbox/Servers.h"

namespace palisade::sandbox {
namespace {

std::string masterTokenIn(const std::filesystem::path& folder) {
  const std::filesystem::path path = folder / "master-token";
  std::string token;
  std::ifstream(path) >> token;
  if (!token.empty()) return token;
  token = "sandbox-master-" + randomText(24);
  if (!(std::ofstream(path) << token << '\n')) throw std::runtime_error("Cannot write " + path.string() + ".");
  return token;
}

// Where anybody can make folders, one of this name may be somebody else's.
void makeFolder(const std::filesystem::path& path) {
  std::filesystem::create_directories(path);
  struct stat status = {};
  if (stat(path.c_str(), &status) != 0 || status.st_uid != getuid()) {
    throw std::runtime_error("The directory " + path.string() + " is somebody else's. Name another one with --directory.");
  }
}

void replaceFile(const std::filesystem::path& path, const std::string& text) {
  const std::filesystem::path unfinished = path.string() + ".new";
  if (!(std::ofstream(unfinished) << text)) throw std::runtime_error("Cannot write " + unfinished.string() + ".");
  std::filesystem::rename(unfinished, path);
}

std::string quoted(const std::string& text) {
  std::string toml = "\"";
  for (const char character : text) {
    if (character == '"' || character == '\\') toml += '\\';
    toml += character;
  }
  return toml + "\"";
}

void serve(const Options& options) {
  // Every thread is made with these blocked; the main thread waits for them.
  sigset_t ends;
  sigemptyset(&ends);
  sigaddset(&ends, SIGTERM);
  sigaddset(&ends, SIGINT);
  pthread_sigmask(SIG_BLOCK, &ends, nullptr);
  std::signal(SIGPIPE, SIG_IGN);

  umask(S_IRWXG | S_IRWXO);
  makeFolder(options.folder);
  const std::filesystem::path folder = std::filesystem::canonical(options.folder);
  const Authority authority(folder);
  TokenOffice office(masterTokenIn(folder),
                     options.permissions ? PermissionList::fromFile(*options.permissions) : PermissionList::builtIn());
  Faults faults;
  RequestLog log;
  const Listener facebook = listenAsFacebook(authority, options.certificate, options.port, office, faults, log);
  const std::string secret = randomText(24);
  replaceFile(folder / "control-secret", secret + "\n");
  const Listener control = listenForControl(authority, secret, office, faults, log);

  const std::string authorityFile = (folder / "ca.pem").string();
  const std::string line = facebook.address() + " " + control.address() + " " + authorityFile + "\n";
  replaceFile(folder / "address", line);
  if (options.configuration) {
    replaceFile(*options.configuration, "# Written by palisade-sandbox.\naddress = " + quoted(facebook.address()) +
                                            "\ncertificate_authorities = " + quoted(authorityFile) + "\n");
  }
  std::fputs(line.c_str(), stdout);
  std::fflush(stdout);

  int signal = 0;
  sigwait(&ends, &signal);
  // Connections may be in the middle of a long fault; there is nothing to save.
  _exit(EXIT_SUCCESS);
}

void run(const Options& options) {
  switch (options.command) {
    case Command::help: std::fputs(helpText().c_str(), stdout); break;
    case Command::serve: serve(options); break;
    default: std::printf("%s\n", askSandbox(options).c_str()); break;
  }
}

}  // namespace
}  // namespace palisade::sandbox

int main(int count, char** words) {
  constexpr int failure = 2;
  try {
    palisade::sandbox::run(palisade::sandbox::parseOptions(count, words));
    return EXIT_SUCCESS;
  } catch (const std::invalid_argument& error) {
    std::fprintf(stderr, "palisade-sandbox: %s Try palisade-sandbox --help.\n", error.what());
  } catch (const std::exception& error) {
    std::fprintf(stderr, "palisade-sandbox: %s\n", error.what());
  }
  return failure;
}
