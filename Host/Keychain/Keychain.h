#pragma once

/// A keychain of the host's own: the platform's operations, and what the daemon needs besides.
///
/// Threads: every operation may be called from any thread. Accounts are `StoredAccount`s; any other account object is an error.
/// Errors: `KeychainManager`'s, with errors in `KeychainErrorDomain`. A read that fails throws `KeychainError`: a credential
/// that cannot be read is not taken for one that is missing. No operation waits for a person, and each ends within seconds.

#include <memory>
#include <string>
#include <vector>

#include "Platform/KeychainManager.h"

namespace palisade {

class Keychain : public KeychainManager {
 public:
  /// The clients that have a credential beside the account's own, in alphabetical order. Throws `KeychainError`.
  virtual std::vector<std::string> clientIDsWithCredentials(const std::shared_ptr<Account>& account) = 0;

  /// For people, on one line: "encrypted vault /home/me/.local/state/palisade/vault.sqlite".
  virtual std::string description() const = 0;
};

}  // namespace palisade
