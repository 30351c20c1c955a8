#pragma once

/// An HTTPS server that takes a request, and sends an answer, in one TLS record each where they fit. The HTTP library's own
/// reads a head byte by byte and sends head and body apart, which is more work than the answer is, and two arrivals for a
/// client.
///
/// Threads: a connection is served on one thread of the library's pool. Errors: a connection on which TLS fails, or whose
/// client neither speaks nor listens in the middle of a request, is closed.

#include <httplib.h>

namespace palisade::sandbox {

class TlsServer final : public httplib::SSLServer {
 public:
  using httplib::SSLServer::SSLServer;

 private:
  bool process_and_close_socket(socket_t socket) override;
};

}  // namespace palisade::sandbox
