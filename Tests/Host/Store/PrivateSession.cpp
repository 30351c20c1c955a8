#include "Tests/Host/Store/PrivateSession.h"

#include <fcntl.h>
#include <poll.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <fstream>
#include <stdexcept>
#include <system_error>

#include "Tests/Host/Store/StoreFiles.h"

namespace palisade {
namespace {

constexpr const char* keyringName = "org.freedesktop.secrets";

std::string configuration(const std::filesystem::path& folder) {
  return "<busconfig><type>session</type><listen>unix:path=" + (folder / "bus").string() +
         "</listen><auth>EXTERNAL</auth><policy context=\"default\"><allow send_destination=\"*\" eavesdrop=\"true\"/>"
         "<allow eavesdrop=\"true\"/><allow own=\"*\"/></policy></busconfig>";
}

// Gives a state of another process time to change, without which a loop would keep it from running.
void pause() { ::poll(nullptr, 0, 5); }

}  // namespace

PrivateSession::PrivateSession() {
  const std::filesystem::path configurationFile = home() / "bus.conf";
  std::ofstream(configurationFile) << configuration(home());
  for (const char* variable : {"HOME", "XDG_DATA_HOME", "XDG_CONFIG_HOME", "XDG_CACHE_HOME", "XDG_RUNTIME_DIR"}) {
    ::setenv(variable, home().c_str(), 1);
  }
  for (const char* variable : {"DISPLAY", "WAYLAND_DISPLAY", "SECRET_BACKEND"}) ::unsetenv(variable);
  ::setenv("DBUS_SESSION_BUS_ADDRESS", ("unix:path=" + (home() / "bus").string()).c_str(), 1);

  _bus = spawn({"dbus-daemon", "--nofork", "--nopidfile", "--config-file=" + configurationFile.string()}, "", {});
  while (!std::filesystem::exists(home() / "bus")) pause();
}

PrivateSession::~PrivateSession() {
  if (_keyring > 0) end(_keyring);
  for (const pid_t process : _processes) end(process);
  endBus();
}

void PrivateSession::endBus() {
  if (_bus > 0) end(_bus);
  _bus = -1;
}

void PrivateSession::startKeyring() {
  startKeyring({"--unlock"}, "password");
  // The daemon takes its name first and makes or unlocks the keyring then.
  waitForAnswer(
      {"dbus-send", "--session", "--print-reply", "--dest=org.freedesktop.secrets", "/org/freedesktop/secrets/collection/login",
       "org.freedesktop.DBus.Properties.Get", "string:org.freedesktop.Secret.Collection", "string:Locked"},
      "boolean false");
}

void PrivateSession::startKeyringWithoutPassword() { startKeyring({}, ""); }

void PrivateSession::startKeyring(const std::vector<std::string>& options, const std::string& input) {
  std::vector<std::string> command{"gnome-keyring-daemon", "--foreground", "--components=secrets"};
  command.insert(command.end(), options.begin(), options.end());
  _keyring = spawn(command, input, home() / "keyring.log");
  waitForName(keyringName, true);
}

void PrivateSession::lockKeyring() {
  run({"dbus-send", "--session", "--print-reply", "--dest=org.freedesktop.secrets", "/org/freedesktop/secrets",
       "org.freedesktop.Secret.Service.Lock", "array:objpath:/org/freedesktop/secrets/collection/login"});
}

void PrivateSession::killKeyring() {
  end(_keyring);
  _keyring = -1;
  waitForName(keyringName, false);
}

void PrivateSession::freezeKeyring() { ::kill(_keyring, SIGSTOP); }

void PrivateSession::thawKeyring() { ::kill(_keyring, SIGCONT); }

std::string PrivateSession::run(const std::vector<std::string>& command) {
  const std::filesystem::path output = home() / "output";
  const pid_t process = spawn(command, "", output);
  ::waitpid(process, nullptr, 0);
  return contentOf(output);
}

void PrivateSession::startService(const std::vector<std::string>& command, const std::string& name) {
  _processes.push_back(spawn(command, "", home() / "service.log"));
  waitForName(name, true);
}

void PrivateSession::record() {
  _processes.push_back(spawn({"dbus-monitor", "--session", "--binary"}, "", home() / "recording"));
  // The monitor says so itself when it is at work: it becomes a monitor and loses its name.
  while (recording().empty()) {
    run({"dbus-send", "--session", "--dest=org.freedesktop.DBus", "/", "org.freedesktop.DBus.GetId"});
    pause();
  }
}

std::string PrivateSession::recording() const { return contentOf(home() / "recording"); }

pid_t PrivateSession::spawn(const std::vector<std::string>& command, const std::string& input,
                            const std::filesystem::path& output) {
  const std::filesystem::path inputFile = home() / "input";
  if (!input.empty()) std::ofstream(inputFile) << input;
  std::vector<char*> arguments;
  for (const std::string& argument : command) arguments.push_back(const_cast<char*>(argument.c_str()));
  arguments.push_back(nullptr);

  const pid_t process = ::fork();
  if (process < 0) throw std::system_error(errno, std::generic_category(), "fork");
  if (process > 0) return process;
  ::prctl(PR_SET_PDEATHSIG, SIGKILL);
  ::dup2(::open(input.empty() ? "/dev/null" : inputFile.c_str(), O_RDONLY), STDIN_FILENO);
  const int place = ::open(output.empty() ? "/dev/null" : output.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0600);
  ::dup2(place, STDOUT_FILENO);
  ::dup2(place, STDERR_FILENO);
  ::execvp(arguments[0], arguments.data());
  ::_exit(127);
}

void PrivateSession::waitForName(const std::string& name, bool isThere) {
  waitForAnswer({"dbus-send", "--session", "--print-reply", "--dest=org.freedesktop.DBus", "/",
                 "org.freedesktop.DBus.NameHasOwner", "string:" + name},
                isThere ? "boolean true" : "boolean false");
}

void PrivateSession::waitForAnswer(const std::vector<std::string>& command, const std::string& answer) {
  for (int attempt = 0; attempt < 2000; ++attempt) {
    if (run(command).find(answer) != std::string::npos) return;
    pause();
  }
  throw std::runtime_error("no " + answer + " from " + command.back() + ": " + contentOf(home() / "output") +
                           contentOf(home() / "keyring.log") + contentOf(home() / "service.log"));
}

void PrivateSession::end(pid_t process) {
  ::kill(process, SIGKILL);
  ::waitpid(process, nullptr, 0);
}

}  // namespace palisade
