#pragma once

/// The sandbox's two listeners on the loopback interface: the Facebook server, which can be told to fail, and the control
/// server, which tells it to and never fails itself. The HTTP library occurs here, in TlsServer and in ControlClient
/// only.
///
/// Threads: made on the main thread; each listener serves from threads of its own until the process ends. Ownership: borrows
/// what it serves. Errors: `std::runtime_error` when a port cannot be had.

#include <memory>
#include <string>

#include "Sandbox/Certificates.h"
#include "Sandbox/Faults.h"
#include "Sandbox/RequestLog.h"
#include "Sandbox/TokenOffice.h"

namespace httplib {
class Server;
}

namespace palisade::sandbox {

/// A listener on 127.0.0.1; `port` is the port that it got.
struct Listener {
  std::unique_ptr<httplib::Server> server;
  int port = 0;

  Listener();
  Listener(Listener&&) noexcept;
  ~Listener();

  std::string address() const { return "https://127.0.0.1:" + std::to_string(port); }
};

/// Port 0 takes any free one.
Listener listenAsFacebook(const Authority& authority, CertificateKind kind, int port, TokenOffice& office, Faults& faults,
                          RequestLog& log);

/// Serves whoever presents `secret` as a bearer token: every user of the machine can reach the port, and issued tokens are
/// shown.
Listener listenForControl(const Authority& authority, const std::string& secret, TokenOffice& office, Faults& faults,
                          RequestLog& log);

}  // namespace palisade::sandbox
