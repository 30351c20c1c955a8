#pragma once

/// The daemon's face on the session bus: com.veltran.Accounts1.
///
/// Threads: `run` reads the bus on the calling thread and on followers, and returns after `stop`. The signals may be emitted
/// from any thread; they are sent when the call that brings them has been answered. Ownership: owns its connection; borrows the
/// service. Errors: a bus that cannot be reached, or a name that another daemon owns, is an exception that says so. A reply
/// that cannot be sent becomes an error reply; what cannot even be said so, `onTrouble` is told.

#include <functional>
#include <memory>
#include <string>

#include "Host/Bus/AccountsService.h"
#include "Platform/NotificationBus.h"

namespace palisade {

class BusServer {
 public:
  BusServer(AccountsService& service, std::function<void(const std::string& sentence)> onTrouble);
  ~BusServer();

  BusServer(const BusServer&) = delete;
  BusServer& operator=(const BusServer&) = delete;

  void run();
  void stop();

  /// The notification bus on the same connection.
  NotificationBus& notifications();

  /// Has the bus start the program that owns `name`, unless it runs; nobody waits for it, and a bus that knows no such program
  /// starts none. From any thread.
  void start(const std::string& name);

  void emitAccountsChanged(const std::string& accountType);
  void emitGrantsChanged(const std::string& accountType, const std::string& client);

 private:
  class Implementation;
  std::unique_ptr<Implementation> _implementation;
};

}  // namespace palisade
