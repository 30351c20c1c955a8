#pragma once

/// The social daemon: waits for whatever gives the courier something to do, until it is told to end.
///
/// Threads: one, which must be the only one when it is made; the HTTP client brings its own. Ownership: owns its parts; borrows
/// the log. Errors: what keeps it from starting is thrown; what happens later is logged and tried again.

#include <chrono>
#include <optional>

#include "Host/Bus/BusPresence.h"
#include "Host/Daemon/StateLock.h"
#include "Host/Http/HttpClient.h"
#include "Host/Json/Json.h"
#include "Host/Social/FacebookServer.h"
#include "Host/Vantad/Courier.h"
#include "Host/Vantad/DeferredKeychain.h"
#include "Host/Vantad/FileWatch.h"
#include "Host/Vantad/NetworkWatch.h"
#include "Host/Vantad/Outbox.h"
#include "Host/Vantad/VantadOptions.h"

namespace palisade {

class Vantad {
 public:
  Vantad(const VantadOptions& options, Log& log);
  Vantad(const Vantad&) = delete;
  Vantad& operator=(const Vantad&) = delete;
  ~Vantad();

  /// Returns after SIGTERM or SIGINT, and with the session bus if there was one.
  void run();

 private:
  enum class Reason { end, configuration };

  Reason serve(const ServerConfiguration& configuration);
  std::optional<std::chrono::milliseconds> advance(Courier& courier);
  ServerConfiguration readConfiguration();

  const VantadOptions _options;
  Log& _log;
  Outbox _outbox;
  StateLock _lock;
  BusPresence _bus;
  FileWatch _bell;
  FileWatch _configurationFile;
  NetworkWatch _network;
  int _signals;
  int _answers;
  DeferredKeychain _keychain;
  NlohmannJsonParser _json;
};

}  // namespace palisade
