#pragma once

/// Halves of keys in the session's Secret Service: one item each in the default collection, with a label for people.
///
/// Every application that may talk to the service can read its items, change them, remove them and add others that look alike.
/// So whoever takes a half from here looks whether it is the right one, and nothing else than halves is ever kept here.
/// It never asks the user to unlock anything: a locked collection is an error that says so. Halves cross the bus encrypted; a
/// service that offers only plain sessions is refused.
///
/// Threads: every operation may be called from any thread; they run one at a time. Errors: `KeychainError`, within twice the
/// time limit. Without a service the object can be made; its operations fail.

#include <chrono>
#include <cstddef>
#include <functional>
#include <memory>
#include <string>

#include "Host/Keychain/KeyHalf.h"

namespace palisade {

class SecretServiceSession;

class SecretServiceHalves {
 public:
  explicit SecretServiceHalves(std::chrono::milliseconds timeLimit);
  ~SecretServiceHalves();

  /// Whether a service answers that has a default collection, locked or not. Throws when it does not answer in time.
  bool isPresent();

  /// Stores the half of the key of that ID, beside whatever is there.
  void add(const std::string& keyID, const KeyHalf& half);

  /// Calls `take` with one half after the other that is stored under the ID, the oldest first, until it answers true. Answers
  /// how many were offered; throws `KeychainErrorLocked` when none was taken and there may be more behind a lock.
  using Take = std::function<bool(const KeyHalf&)>;
  std::size_t offer(const std::string& keyID, const Take& take);

  /// Removes credentials themselves, which earlier versions kept here, unless they are locked. Answers how
  /// many.
  std::size_t removeCredentials();

 private:
  const std::unique_ptr<SecretServiceSession> _session;
};

}  // namespace palisade
