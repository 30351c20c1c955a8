#pragma once

/// A keychain of the host's own: the platform's operations, and what the daemon needs besides.
///
/// Threads: every operation may be called from any thread. Accounts are `StoredAccount`s; any other account object is an error.
/// Errors: `KeychainManager`'s, with errors in `KeychainErrorDomain`. A read that fails throws `KeychainError`: a credential
/// that cannot be read is not taken for one that is missing. No operation waits for a person, and each ends within seconds.

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "Platform/KeychainManager.h"

namespace palisade {

class Keychain : public KeychainManager {
 public:
  /// The clients that have a credential beside the account's own, in alphabetical order. Throws `KeychainError`.
  virtual std::vector<std::string> clientIDsWithCredentials(const std::shared_ptr<Account>& account) = 0;

  /// For people, on one line: where credentials lie, and who is kept from them.
  virtual std::string description() = 0;

  /// What is wrong, for people; none when all that is stored can be read. Waits for seconds at most.
  virtual std::optional<std::string> trouble() = 0;
};

}  // namespace palisade
