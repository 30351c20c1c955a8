#pragma once

/// The account daemon: every part of the host, made and tied together. The only place that names concrete classes.
///
/// Threads: made and run by the main thread; `stop` comes from any thread. Ownership: owns everything. Errors: what keeps the
/// daemon from serving is an exception with a sentence that says what to do.

#include <memory>

#include "Host/Daemon/Configuration.h"
#include "Platform/SystemAlert.h"

namespace palisade {

class AccountDaemon {
 public:
  /// Asks the user of the session, or `alert`, which it borrows: the benchmarks' daemon answers by itself. accountd has none.
  explicit AccountDaemon(const DaemonConfiguration& configuration, SystemAlert* alert = nullptr);
  ~AccountDaemon();

  AccountDaemon(const AccountDaemon&) = delete;
  AccountDaemon& operator=(const AccountDaemon&) = delete;

  /// Serves until `stop`.
  void run();

  /// Withdraws what waits for the user, and ends `run`.
  void stop();

 private:
  struct Parts;
  std::unique_ptr<Parts> _parts;
};

}  // namespace palisade
