// accountd: the account daemon of one user's session.

#include <pthread.h>
#include <unistd.h>

#include <csignal>
#include <exception>
#include <iostream>
#include <memory>
#include <mutex>
#include <thread>

#include "Host/Daemon/AccountDaemon.h"
#include "Host/Daemon/AtEnd.h"
#include "Host/Daemon/Paths.h"
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

// The daemon that a signal stops, or null when it is going away by itself: a session that ends takes the bus away and sends the
// signal, in any order.
struct Serving {
  std::mutex mutex;
  AccountDaemon* daemon = nullptr;
};

// Work that waits for a server may take minutes more. What is stored is safe at every moment, so the process does not wait for
// it.
void stopWhenSignalled(const std::shared_ptr<Serving>& serving, sigset_t signals) {
  std::thread([serving, signals] {
    int signal = 0;
    sigwait(&signals, &signal);
    {
      const std::lock_guard lock(serving->mutex);
      if (serving->daemon != nullptr) serving->daemon->stop();
    }
    std::this_thread::sleep_for(longestFarewell);
    _exit(0);
  }).detach();
}

// The plug-ins that were installed with this daemon, wherever that was.
std::filesystem::path installedPlugins() {
  return (std::filesystem::read_symlink("/proc/self/exe").parent_path() / PALISADE_PLUGIN_FOLDER).lexically_normal();
}

int serve(const palisade::DaemonConfiguration& configuration) {
  const sigset_t signals = blockEndingSignals();
  AccountDaemon daemon(configuration);
  const auto serving = std::make_shared<Serving>();
  serving->daemon = &daemon;
  const palisade::AtEnd leave([&] {
    const std::lock_guard lock(serving->mutex);
    serving->daemon = nullptr;
  });
  stopWhenSignalled(serving, signals);
  daemon.run();
  return 0;
}

}  // namespace

int main(int argumentCount, char** arguments) {
  try {
    palisade::keepKnownEnvironment();
    palisade::DaemonConfiguration configuration{.plugins = installedPlugins()};
    if (const auto table = palisade::readTomlFile(palisade::configurationFile("accountd.toml"))) {
      palisade::applyConfigurationFile(*table, configuration);
    }
    switch (palisade::applyCommandLine(argumentCount, arguments, configuration)) {
      case palisade::CommandLineRequest::help: std::cout << palisade::daemonHelp; return 0;
      case palisade::CommandLineRequest::version: std::cout << "accountd " PALISADE_VERSION "\n"; return 0;
      case palisade::CommandLineRequest::serve: break;
    }
    palisade::dropDumpable();
    return serve(configuration);
  } catch (const std::exception& failure) {
    std::cerr << "accountd: " << failure.what() << '\n';
    return 1;
  }
}
