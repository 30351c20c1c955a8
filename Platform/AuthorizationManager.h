#pragma once

/// The daemon's store of `ClientAuthorization` records: at most one a client and account type.
///
/// Threads: every operation may be called from any thread, several at a time.
/// Ownership: records are handed out as detached copies and taken in by value of their content.
/// Errors: a look-up without a match answers none or an empty list; a store that cannot be read or written throws or, where an
/// operation returns an error, answers it. After an error nothing has changed.

#include <memory>
#include <optional>
#include <vector>

#include "Platform/ClientAuthorization.h"
#include "Platform/Error.h"

namespace palisade {

class AccountType;

class AuthorizationManager {
 public:
  virtual ~AuthorizationManager() = default;

  /// The client's record for the account type, or none.
  virtual std::shared_ptr<ClientAuthorization> authorizationForClient(const std::shared_ptr<const Client>& client,
                                                                      const AccountType& accountType) = 0;

  /// Every client's record for the account type, granted or refused, in the store's order.
  virtual std::vector<std::shared_ptr<ClientAuthorization>> allAuthorizationsForAccountType(const AccountType& accountType) = 0;

  /// Makes `authorization` the client's record for the account type, in place of any earlier one. None when it is stored.
  virtual std::optional<Error> setAuthorization(const ClientAuthorization& authorization,
                                                const std::shared_ptr<const Client>& forClient,
                                                const AccountType& onAccountType) = 0;

  virtual std::optional<Error> removeAllClientAuthorizationsForAccountType(const AccountType& accountType) = 0;
};

}  // namespace palisade
