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

struct Timings {
  std::vector<double> microseconds;
  std::exception_ptr failure;
};

void callUntil(const std::atomic<bool>& isOver, const BusCall& call, Timings& timings) {
  try {
    const Bus bus = openBus();
    call(*bus);  // The first call of a connection makes its server find out who is calling.
    while (!isOver) {
      const auto start = Clock::now();
      call(*bus);
      timings.microseconds.push_back(std::chrono::duration<double, std::micro>(Clock::now() - start).count());
    }
  } catch (...) {
    timings.failure = std::current_exception();
  }
}

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
  std::atomic<bool> isOver = false;
  std::vector<Timings> timings(static_cast<std::size_t>(clients));
  const double processorTimeBefore = processorMicroseconds(server);
  {
    std::vector<std::jthread> threads;
    for (Timings& own : timings) threads.emplace_back([&] { callUntil(isOver, call, own); });
    std::this_thread::sleep_for(duration);
    isOver = true;
  }
  const double processorTime = processorMicroseconds(server) - processorTimeBefore;

  std::vector<double> all;
  for (const Timings& own : timings) {
    if (own.failure) std::rethrow_exception(own.failure);
    all.insert(all.end(), own.microseconds.begin(), own.microseconds.end());
  }
  if (all.empty()) throw BusCallError("No call was answered while the clients ran.");
  std::ranges::sort(all);
  const auto calls = static_cast<double>(all.size());
  return {.medianMicroseconds = all[all.size() / 2],
          .slowestHundredthMicroseconds = all[all.size() * 99 / 100],
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
