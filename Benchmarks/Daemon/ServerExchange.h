#pragma once

/// The least that fetching a token from the server can cost: a request that it refuses at once, over a connection that stays
/// open, with the daemon's own settings.
///
/// Threads: one. Errors: `std::runtime_error`, also for a server that cannot be reached.

#include "Host/Social/ServerConfiguration.h"

namespace palisade {

class ServerExchange {
 public:
  ServerExchange();

  void run();

 private:
  const ServerConfiguration _server;
  HttpClient _http;
};

}  // namespace palisade
