#pragma once

/// Calls a service of the bus from several clients at once and measures what a call takes.
///
/// Each client is a thread with a connection of its own that calls again as soon as it is answered. Threads: `measure` is
/// called on one thread and returns when all clients have ended. Errors: `BusCallError` with the name of the bus error.

#include <sys/types.h>

#include <chrono>
#include <functional>
#include <memory>
#include <stdexcept>
#include <string>

struct sd_bus;

namespace palisade {

class BusCallError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

struct CloseBus {
  void operator()(sd_bus* bus) const;
};
using Bus = std::unique_ptr<sd_bus, CloseBus>;

Bus openBus();

/// Throws `BusCallError` when `result`, which is sd-bus's, is an error.
int requireSuccess(int result, const std::string& during);

/// One call, which returns when it is answered.
using BusCall = std::function<void(sd_bus&)>;

struct Load {
  double medianMicroseconds = 0;
  double slowestHundredthMicroseconds = 0;
  double callsPerSecond = 0;
  double serverMicroseconds = 0;  ///< processor time of the server a call
};

/// `server` is the process whose processor time is counted.
Load measureLoad(const BusCall& call, int clients, std::chrono::milliseconds duration, pid_t server);

/// The process that owns a name on the bus.
pid_t processOwning(sd_bus& bus, const std::string& name);

/// The part of a process's memory that is its own, shared pages counted by their share, in megabytes.
double proportionalMegabytes(pid_t process);

}  // namespace palisade
