// The account daemon with somebody who presses Allow at once: for measuring what follows the answer. It is built for the
// benchmarks alone and never installed.

#include <pthread.h>

#include <csignal>
#include <exception>
#include <iostream>
#include <thread>

#include "Host/Daemon/AccountDaemon.h"
#include "Host/Daemon/Paths.h"
#include "Host/Preferences/TomlFile.h"
#include "Host/Secrets/ProcessEnvironment.h"

namespace {

using namespace palisade;

class AllowingAlert final : public SystemAlert {
 public:
  std::shared_ptr<AlertHandle> createAlert(AlertAllocator, double, unsigned, int*, const AlertDescription&) override {
    return std::make_shared<AlertHandle>();
  }
  int receiveResponse(const std::shared_ptr<AlertHandle>&, double, AlertResponse& response) override {
    response = AlertResponseDefaultButton;
    return 0;
  }
  void releaseAlert(std::shared_ptr<AlertHandle>) override {}
};

}  // namespace

int main() {
  try {
    sigset_t signals;
    sigemptyset(&signals);
    sigaddset(&signals, SIGTERM);
    pthread_sigmask(SIG_BLOCK, &signals, nullptr);
    keepKnownEnvironment();

    DaemonConfiguration configuration;
    if (const auto table = readTomlFile(configurationFile("accountd.toml"))) applyConfigurationFile(*table, configuration);
    AllowingAlert alert;
    AccountDaemon daemon(configuration, &alert);
    std::thread stopper([&] {
      int signal = 0;
      sigwait(&signals, &signal);
      daemon.stop();
    });
    daemon.run();
    stopper.join();
    return 0;
  } catch (const std::exception& failure) {
    std::cerr << "palisade-answering-accountd: " << failure.what() << '\n';
    return 1;
  }
}
