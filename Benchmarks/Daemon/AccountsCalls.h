#pragma once

/// The calls that are measured, each as a client makes it: with sd-bus, and blocking.
///
/// Threads: any, each with a bus connection of its own. Errors: `BusCallError`, also for an answer that is not the one that the
/// measurement is about.

#include <systemd/sd-bus.h>

#include <cstdint>
#include <memory>
#include <string>

#include "Benchmarks/Daemon/BusLoad.h"

namespace palisade {

/// The bare echo of a message as large as a request for access.
void callEcho(sd_bus& bus);

/// A request that an earlier grant answers.
void requestGrantedAccess(sd_bus& bus);

/// So many requests that the server has to be asked about, whose outcomes nobody waits for. Returns when each has been replied
/// to: how many of them the daemon carries.
int requestWithoutWaiting(sd_bus& bus, int count);

/// An application that listens for the outcomes of its requests.
class WaitingApplication {
 public:
  explicit WaitingApplication(sd_bus& bus);

  /// A request that somebody has to be asked about; returns when the outcome is known, and that has to be a grant.
  void requestAccess();

 private:
  struct Outcome {
    std::string request;
    std::uint32_t response = 0;
  };
  struct ReleaseSlot {
    void operator()(sd_bus_slot* slot) const;
  };

  static int rememberOutcome(sd_bus_message* message, void* outcome, sd_bus_error*);

  sd_bus& _bus;
  Outcome _outcome;
  std::unique_ptr<sd_bus_slot, ReleaseSlot> _match;
};

void readCredential(sd_bus& bus);

/// Of one client it would leave a refusal behind, after which nobody is asked again.
void revokeEverything(sd_bus& bus);

/// Peers: another service's look-up of a stored decision, and of an authorization.
void preparePermissionStore(sd_bus& bus);
void lookUpPermission(sd_bus& bus);
void checkAuthorization(sd_bus& bus);

}  // namespace palisade
