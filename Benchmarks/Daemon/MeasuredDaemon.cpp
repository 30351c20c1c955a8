#include "Benchmarks/Daemon/MeasuredDaemon.h"

#include <spawn.h>
#include <sys/wait.h>
#include <systemd/sd-bus.h>

#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstring>

#include "Benchmarks/Daemon/BusLoad.h"

namespace palisade {
namespace {

constexpr const char* name = "com.veltran.Accounts1";
constexpr std::chrono::seconds patience{20};

bool isOwned(sd_bus& bus) {
  sd_bus_creds* credentials = nullptr;
  const int result = sd_bus_get_name_creds(&bus, name, 0, &credentials);
  sd_bus_creds_unref(credentials);
  return result >= 0;
}

int wake(sd_bus_message*, void*, sd_bus_error*) { return 0; }

// Waits for the bus to say that the name's owner changed, rather than asking again and again.
void waitUntilOwned(bool owned, const Bus& bus) {
  requireSuccess(
      sd_bus_match_signal(bus.get(), nullptr, "org.freedesktop.DBus", nullptr, nullptr, "NameOwnerChanged", wake, nullptr),
      "The bus does not tell about names");
  const auto end = std::chrono::steady_clock::now() + patience;
  while (isOwned(*bus) != owned) {
    if (std::chrono::steady_clock::now() > end) throw BusCallError("The account daemon did not come or go in time.");
    if (requireSuccess(sd_bus_process(bus.get(), nullptr), "The bus went away") == 0) sd_bus_wait(bus.get(), 1'000'000);
  }
}

}  // namespace

MeasuredDaemon::MeasuredDaemon(const std::string& program) {
  const Bus bus = openBus();
  std::string word = program;
  char* const arguments[] = {word.data(), nullptr};
  const int error = posix_spawnp(&_process, program.c_str(), nullptr, nullptr, arguments, environ);
  if (error != 0) throw BusCallError(program + ": " + std::strerror(error));
  waitUntilOwned(true, bus);
}

MeasuredDaemon::~MeasuredDaemon() {
  kill(_process, SIGTERM);
  while (waitpid(_process, nullptr, 0) < 0 && errno == EINTR) {
  }
}

void stopDaemon(pid_t process) {
  kill(process, SIGTERM);
  waitUntilOwned(false, openBus());
}

}  // namespace palisade
