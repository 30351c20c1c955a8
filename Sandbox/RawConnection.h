#pragma once

/// A client's connection below HTTP, for faults that a well-behaved server does not have.
///
/// Threads: the one that serves the connection. Ownership: borrows the connection; whatever HTTP server owns it finds it closed
/// afterwards. Errors: once the client is gone every operation returns at once.

#include <openssl/ssl.h>

#include <string_view>

namespace palisade::sandbox {

class RawConnection {
 public:
  explicit RawConnection(SSL& connection) : _connection(connection) {}
  RawConnection(const RawConnection&) = delete;
  RawConnection& operator=(const RawConnection&) = delete;

  /// Closes; says no TLS goodbye.
  ~RawConnection();

  /// False when the client is gone.
  bool write(std::string_view bytes);

  /// Returns when the client has ended the connection, or says something more.
  void waitForClient();

  void reset();

 private:
  SSL& _connection;
};

}  // namespace palisade::sandbox
