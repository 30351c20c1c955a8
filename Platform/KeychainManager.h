#pragma once

/// The user's keychain: one credential for each account and client ID. The entry with client ID none is the account's own
/// credential, whose token signs requests to the account's server (the master token).
///
/// Threads: every operation may be called from any thread.
/// Errors: a missing entry is none, not an error. Writes and removals answer what went wrong, if anything; a failed write
/// leaves the earlier entry in place.

#include <memory>
#include <optional>
#include <string>

#include "Platform/AccountCredential.h"
#include "Platform/Error.h"

namespace palisade {

class Account;

class KeychainManager {
 public:
  virtual ~KeychainManager() = default;

  virtual std::shared_ptr<const AccountCredential> credentialForAccount(const std::shared_ptr<Account>& account,
                                                                        const std::optional<std::string>& clientID) = 0;

  /// Writes the account object's `credential()` under (account, client ID), in place of any earlier entry.
  virtual std::optional<Error> setCredentialForAccount(const std::shared_ptr<Account>& account,
                                                       const std::optional<std::string>& clientID) = 0;

  virtual std::optional<Error> removeCredentialForAccount(const std::shared_ptr<Account>& account,
                                                          const std::optional<std::string>& clientID) = 0;
};

}  // namespace palisade
