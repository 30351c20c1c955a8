// accountd: the account daemon of one user's session.

#include <malloc.h>
#include <pthread.h>
#include <sys/resource.h>
#include <unistd.h>

#include <csignal>
#include <exception>
#include <functional>
#include <iostream>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <thread>

#include "Host/Bus/BusServer.h"
#include "Host/Daemon/AccountDaemon.h"
#include "Host/Daemon/AtEnd.h"
#include "Host/Daemon/Paths.h"
#include "Host/Daemon/RefusingService.h"
#include "Host/Preferences/TomlFile.h"
#include "Host/Secrets/ProcessEnvironment.h"
#include "Host/Secrets/ProcessSecrecy.h"

namespace {

using palisade::AccountDaemon;

constexpr std::chrono::seconds longestFarewell(1);

// Every thread inherits the blocked signals, so that only the one that waits for them takes them.
sigset_t blockEndingSignals() {
  sigset_t signals;
  sigemptyset(&signals);
  sigaddset(&signals, SIGTERM);
  sigaddset(&signals, SIGINT);
  pthread_sigmask(SIG_BLOCK, &signals, nullptr);
  return signals;
}

// What a signal stops; nothing when that is going away by itself: a session that ends takes the bus away and sends the signal,
// in any order.
struct Serving {
  std::mutex mutex;
  std::function<void()> stop;
};

// Work that waits for a server may take minutes more. What is stored is safe at every moment, so the process does not wait for
// it.
void stopWhenSignalled(const std::shared_ptr<Serving>& serving, sigset_t signals) {
  std::thread([serving, signals] {
    int signal = 0;
    sigwait(&signals, &signal);
    {
      const std::lock_guard lock(serving->mutex);
      if (serving->stop) serving->stop();
    }
    std::this_thread::sleep_for(longestFarewell);
    _exit(0);
  }).detach();
}

// Many threads wait, and few work at a time: an arena for each would only keep what a crowd of calls once took.
void shareMemoryAmongThreads() { mallopt(M_ARENA_MAX, 1); }

// A call that waits keeps what descriptors its caller has sent along, asked for or not. The usual soft limit is for programs
// that still use select(2), which nothing here does.
void useAllowedDescriptors() {
  rlimit limit{};
  if (getrlimit(RLIMIT_NOFILE, &limit) != 0) return;
  limit.rlim_cur = limit.rlim_max;
  setrlimit(RLIMIT_NOFILE, &limit);
}

// The plug-ins that were installed with this daemon, wherever that was.
std::filesystem::path installedPlugins() {
  return (std::filesystem::read_symlink("/proc/self/exe").parent_path() / PALISADE_PLUGIN_FOLDER).lexically_normal();
}

// Runs what is there until a signal or its own end stops it.
template <typename Served>
int serveUntilStopped(Served& served, sigset_t signals) {
  const auto serving = std::make_shared<Serving>();
  serving->stop = [&served] { served.stop(); };
  const palisade::AtEnd leave([&] {
    const std::lock_guard lock(serving->mutex);
    serving->stop = nullptr;
  });
  stopWhenSignalled(serving, signals);
  served.run();
  return 0;
}

int serve(const palisade::DaemonConfiguration& configuration) {
  const sigset_t signals = blockEndingSignals();
  AccountDaemon daemon(configuration);
  return serveUntilStopped(daemon, signals);
}

// What is wrong with the files that the daemon is configured by, if others could have written one.
std::optional<std::string> exposedConfiguration() {
  try {
    for (const char* name : {"accountd.toml", "server.toml"}) palisade::requireUnexposed(palisade::configurationFile(name));
    return std::nullopt;
  } catch (const palisade::ExposedFile& exposed) {
    return exposed.what();
  }
}

// Whoever asks hears why; a daemon that did not start could tell nobody.
int refuse(const std::string& trouble) {
  const sigset_t signals = blockEndingSignals();
  const auto say = [](const std::string& sentence) { std::cerr << "accountd: " << sentence << '\n'; };
  say(trouble);
  std::function<void()> end;
  palisade::RefusingService service(exposedConfiguration, [&end] { end(); });
  palisade::BusServer bus(service, say);
  end = [&bus] { bus.stop(); };
  return serveUntilStopped(bus, signals);
}

}  // namespace

int main(int argumentCount, char** arguments) {
  try {
    palisade::keepKnownEnvironment();
    palisade::DaemonConfiguration configuration{.plugins = installedPlugins()};
    const auto trouble = exposedConfiguration();
    const auto table = trouble ? std::nullopt : palisade::readConfiguration(palisade::configurationFile("accountd.toml"));
    if (table) palisade::applyConfigurationFile(*table, configuration);
    switch (palisade::applyCommandLine(argumentCount, arguments, configuration)) {
      case palisade::CommandLineRequest::help: std::cout << palisade::daemonHelp; return 0;
      case palisade::CommandLineRequest::version: std::cout << "accountd " PALISADE_VERSION "\n"; return 0;
      case palisade::CommandLineRequest::serve: break;
    }
    palisade::dropDumpable();
    useAllowedDescriptors();
    shareMemoryAmongThreads();
    return trouble ? refuse(*trouble) : serve(configuration);
  } catch (const std::exception& failure) {
    std::cerr << "accountd: " << failure.what() << '\n';
    return 1;
  }
}
