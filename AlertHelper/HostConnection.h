#pragma once

/// The daemon, as the helper sees it: a socket on which one question comes and one answer goes.
///
/// Threads: one. Ownership: owns the descriptor. Errors: what is no question is none.

#include <optional>

#include "Host/Alert/AlertQuestion.h"

namespace palisade {

class HostConnection {
 public:
  explicit HostConnection(int socket) : _socket(socket) {}
  HostConnection(const HostConnection&) = delete;
  HostConnection& operator=(const HostConnection&) = delete;
  ~HostConnection();

  /// Waits for the question.
  std::optional<AlertQuestion> receiveQuestion() const;

  /// Whether the whole answer went out.
  bool answer(const AlertNonce& nonce, AlertWord word) const;

  /// Becomes readable when the daemon has nothing to hear any more.
  int descriptor() const { return _socket; }

 private:
  std::optional<std::string> receive(std::size_t size) const;

  int _socket;
};

}  // namespace palisade
