#pragma once

/// The account store as one operation sees it.
///
/// A refusal that the user did not give (the alert was withdrawn, nobody could be asked) is stored with that mark, so that it
/// can be removed when the operation has ended: the plug-in asks for the record and gets it, but it does not stay. A record
/// that could not be stored fails the operation, whatever the plug-in makes of it. Once the access that the operation is about
/// was taken back, nothing of it is stored. Threads: used by the operation's thread and
/// by the threads that bring its server's answers. Ownership: shared by the plug-in's callbacks; keeps the operation, borrows
/// the store. Errors: the store's.

#include <memory>

#include "Host/Accounts/SqliteAccountStore.h"
#include "Host/Daemon/Operation.h"

namespace palisade {

class OperationStore final : public AccountStore, public AuthorizationManager {
 public:
  OperationStore(SqliteAccountStore& store, std::shared_ptr<Operation> operation)
      : _store(store),
        _operation(std::move(operation)) {}

  std::vector<std::shared_ptr<Account>> accountsWithAccountTypeIdentifier(std::string_view identifier) override {
    return _store.accountsWithAccountTypeIdentifier(identifier);
  }

  AuthorizationManager& authorizationManager() override { return *this; }

  std::shared_ptr<ClientAuthorization> authorizationForClient(const std::shared_ptr<const Client>& client,
                                                              const AccountType& accountType) override {
    return _store.authorizationForClient(client, accountType);
  }

  std::vector<std::shared_ptr<ClientAuthorization>> allAuthorizationsForAccountType(const AccountType& accountType) override {
    return _store.allAuthorizationsForAccountType(accountType);
  }

  std::optional<Error> setAuthorization(const ClientAuthorization& authorization,
                                        const std::shared_ptr<const Client>& forClient,
                                        const AccountType& onAccountType) override {
    if (authorization.isGranted() && _operation->failure()) {
      return Error{.domain = std::string(StoreErrorDomain),
                   .code = StoreErrorConstraint,
                   .description = "A grant whose token could not be stored is not recorded."};
    }
    return answered(_operation->unlessRevoked([&] {
      if (authorization.isGranted() || _operation->isAnsweredByUser()) {
        return _store.setAuthorization(authorization, forClient, onAccountType);
      }
      _operation->refusalByNobodyIsStored();
      return _store.setAuthorizationAnsweredByNobody(authorization, forClient, onAccountType);
    }));
  }

  std::optional<Error> removeAllClientAuthorizationsForAccountType(const AccountType& accountType) override {
    return answered(_store.removeAllClientAuthorizationsForAccountType(accountType));
  }

 private:
  std::optional<Error> answered(std::optional<Error> error) {
    if (error) _operation->fail({BusFailureKind::storeUnavailable, error->description.value_or("The store refused.")});
    return error;
  }

  SqliteAccountStore& _store;
  std::shared_ptr<Operation> _operation;
};

}  // namespace palisade
