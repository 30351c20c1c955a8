#pragma once

/// One account of the user, as an object held for one look-up.
///
/// Threads: the store hands out one object a look-up, so two requests never share one; a plug-in may use it from the thread of
/// the operation and, after that, from the thread that carries the server's answer.
/// Ownership: `std::shared_ptr`; callbacks keep it alive.
/// Errors: no operation fails. `setAccountType` and `setCredential` change this object only; nothing is saved.

#include <memory>
#include <string>

namespace palisade {

class AccountCredential;
class AccountType;

class Account {
 public:
  virtual ~Account() = default;

  /// The account for people and for log records, on one line.
  virtual std::string description() const = 0;

  virtual void setAccountType(std::shared_ptr<const AccountType> accountType) = 0;

  /// The credential that `KeychainManager::setCredentialForAccount` is to write; none until it has been set.
  virtual std::shared_ptr<const AccountCredential> credential() const = 0;
  virtual void setCredential(std::shared_ptr<const AccountCredential> credential) = 0;
};

}  // namespace palisade
