#pragma once

/// The keychain as the plug-ins see it: it knows for whose operation it works.
///
/// Before a client's token is stored, the grant that it is for is noted in the account store, so that a crash between the two
/// leaves no token that nobody answers for. A keychain that refuses fails the operation: no grant stands without its token. The
/// token of an operation whose access was taken back does not stay. An application that cools down does not get as far as the
/// keychain with what its user would have to be asked about.
/// Threads: as `KeychainManager` says. Ownership: borrows the keychain and the store. Errors: the keychain's and the store's.

#include <functional>
#include <memory>
#include <string>

#include "Platform/KeychainManager.h"

namespace palisade {

class AlertCoolDown;
class Operation;
class SqliteAccountStore;

class OperationKeychain final : public KeychainManager {
 public:
  /// The operation that a client's turn belongs to, or null.
  using Finder = std::function<std::shared_ptr<Operation>(const std::string& clientID)>;

  OperationKeychain(KeychainManager& keychain, SqliteAccountStore& store, AlertCoolDown& coolDown, Finder operationOf);

  std::shared_ptr<const AccountCredential> credentialForAccount(const std::shared_ptr<Account>& account,
                                                                const std::optional<std::string>& clientID) override;
  std::optional<Error> setCredentialForAccount(const std::shared_ptr<Account>& account,
                                               const std::optional<std::string>& clientID) override;
  std::optional<Error> removeCredentialForAccount(const std::shared_ptr<Account>& account,
                                                  const std::optional<std::string>& clientID) override;

 private:
  KeychainManager& _keychain;
  SqliteAccountStore& _store;
  AlertCoolDown& _coolDown;
  const Finder _operationOf;
};

}  // namespace palisade
