#include "Benchmarks/Daemon/BusLoad.h"

#include <systemd/sd-bus.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <cstring>
#include <ctime>
#include <exception>
#include <fstream>
#include <mutex>
#include <thread>
#include <vector>

namespace palisade {
namespace {

using Clock = std::chrono::steady_clock;

// The processor time that all of a process's threads have used. proc(5) would count in hundredths of a second, and whole ticks.
double processorMicroseconds(pid_t process) {
  clockid_t clock{};
  timespec used{};
  if (clock_getcpuclockid(process, &clock) != 0 || clock_gettime(clock, &used) != 0) {
    throw std::runtime_error("The processor time of process " + std::to_string(process) + " cannot be read.");
  }
  return static_cast<double>(used.tv_sec) * 1e6 + static_cast<double>(used.tv_nsec) / 1e3;
}

struct Client {
  Bus bus = openBus();
  std::vector<double> microseconds = {};
  std::exception_ptr failure = nullptr;

  void callUntil(const std::atomic<bool>& isOver, const BusCall& call) {
    try {
      while (!isOver) {
        const auto start = Clock::now();
        call(*bus);
        microseconds.push_back(std::chrono::duration<double, std::micro>(Clock::now() - start).count());
      }
    } catch (...) {
      failure = std::current_exception();
    }
  }
};

}  // namespace

void CloseBus::operator()(sd_bus* bus) const { sd_bus_flush_close_unref(bus); }

int requireSuccess(int result, const std::string& during) {
  if (result < 0) throw BusCallError(during + ": " + std::strerror(-result));
  return result;
}

Bus openBus() {
  sd_bus* bus = nullptr;
  requireSuccess(sd_bus_open_user(&bus), "The session bus cannot be reached");
  return Bus(bus);
}

Load measureLoad(const BusCall& call, int clients, std::chrono::milliseconds duration, pid_t server) {
  std::vector<Client> all(static_cast<std::size_t>(clients));
  // The first call of a connection makes its server find out who is calling.
  for (const Client& client : all) call(*client.bus);
  std::atomic<bool> isOver = false;
  const double processorTimeBefore = processorMicroseconds(server);
  {
    std::vector<std::jthread> threads;
    for (Client& client : all) threads.emplace_back([&] { client.callUntil(isOver, call); });
    std::this_thread::sleep_for(duration);
    isOver = true;
  }
  const double processorTime = processorMicroseconds(server) - processorTimeBefore;

  std::vector<double> timings;
  for (const Client& client : all) {
    if (client.failure) std::rethrow_exception(client.failure);
    timings.insert(timings.end(), client.microseconds.begin(), client.microseconds.end());
  }
  if (timings.empty()) throw BusCallError("No call was answered while the clients ran.");
  std::ranges::sort(timings);
  const auto calls = static_cast<double>(timings.size());
  return {.medianMicroseconds = timings[timings.size() / 2],
          .slowestHundredthMicroseconds = timings[timings.size() * 99 / 100],
          .callsPerSecond = calls / std::chrono::duration<double>(duration).count(),
          .serverMicroseconds = processorTime / calls};
}

pid_t processOwning(sd_bus& bus, const std::string& name) {
  sd_bus_creds* credentials = nullptr;
  requireSuccess(sd_bus_get_name_creds(&bus, name.c_str(), SD_BUS_CREDS_PID, &credentials), name + " has no owner");
  pid_t process = -1;
  const int result = sd_bus_creds_get_pid(credentials, &process);
  sd_bus_creds_unref(credentials);
  requireSuccess(result, name + " has an owner without a process");
  return process;
}

double proportionalMegabytes(pid_t process) {
  std::ifstream file("/proc/" + std::to_string(process) + "/smaps_rollup");
  for (std::string line; std::getline(file, line);) {
    if (line.starts_with("Pss:")) return std::stod(line.substr(4)) / 1024;
  }
  throw std::runtime_error("The memory of process " + std::to_string(process) + " cannot be read.");
}

}  // namespace palisade
