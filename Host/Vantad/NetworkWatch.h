#pragma once

/// Tells that this machine has got an address or a route: a server that was out of reach may not be any more.
///
/// Threads: one. Ownership: owns its socket. Errors: throws `std::system_error` when the kernel offers no such news.

namespace palisade {

class NetworkWatch {
 public:
  NetworkWatch();
  NetworkWatch(const NetworkWatch&) = delete;
  NetworkWatch& operator=(const NetworkWatch&) = delete;
  ~NetworkWatch();

  /// Becomes readable when there is something to ask about.
  int descriptor() const { return _socket; }

  /// Whether an address or a route has come since the last time. Does not wait.
  bool hasImproved();

 private:
  int _socket;
};

}  // namespace palisade
