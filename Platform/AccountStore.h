#pragma once

/// The daemon's accounts, and the way to its authorization records.
///
/// Threads: every operation may be called from any thread. Ownership: the store outlives every plug-in; accounts are shared.
/// Errors: no accounts is an empty list; a store that cannot be read throws.

#include <memory>
#include <string_view>
#include <vector>

namespace palisade {

class Account;
class AuthorizationManager;

class AccountStore {
 public:
  virtual ~AccountStore() = default;

  /// The accounts of the type, in the store's order, each a fresh object.
  virtual std::vector<std::shared_ptr<Account>> accountsWithAccountTypeIdentifier(std::string_view identifier) = 0;

  /// Lives as long as the store.
  virtual AuthorizationManager& authorizationManager() = 0;
};

}  // namespace palisade
