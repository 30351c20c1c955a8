#include "Host/Daemon/OperationKeychain.h"

#include <utility>

#include "Host/Accounts/SqliteAccountStore.h"
#include "Host/Daemon/AlertCoolDown.h"
#include "Host/Daemon/Operation.h"

namespace palisade {
namespace {

// Passes an error on, and has the operation fail with it.
std::optional<Error> answered(std::optional<Error> error, BusFailureKind kind, Operation* operation) {
  if (error && operation != nullptr) operation->fail({kind, error->description.value_or("The keychain refused.")});
  return error;
}

}  // namespace

OperationKeychain::OperationKeychain(KeychainManager& keychain, SqliteAccountStore& store, AlertCoolDown& coolDown,
                                     Finder operationOf)
    : _keychain(keychain),
      _store(store),
      _coolDown(coolDown),
      _operationOf(std::move(operationOf)) {}

std::shared_ptr<const AccountCredential> OperationKeychain::credentialForAccount(const std::shared_ptr<Account>& account,
                                                                                 const std::optional<std::string>& clientID) {
  if (Operation* const operation = Operation::current()) {
    const bool isUserStillToBeAsked = operation->grant() && !operation->isAnsweredByUser();
    const auto refusal = isUserStillToBeAsked ? _coolDown.refusalFor(operation->grant()->clientID) : std::nullopt;
    if (refusal) {
      operation->fail(*refusal);
      throw BusFailure(*refusal);
    }
    if (isUserStillToBeAsked) operation->keepsServicesBusy();
    operation->aboutToWait();
  }
  return _keychain.credentialForAccount(account, clientID);
}

std::optional<Error> OperationKeychain::setCredentialForAccount(const std::shared_ptr<Account>& account,
                                                                const std::optional<std::string>& clientID) {
  // The server's answers come on threads that carry no operation.
  const auto operation = clientID ? _operationOf(*clientID) : nullptr;
  if (operation != nullptr) {
    auto unnoted = operation->noteGrant([this](const Intent& grant) { return _store.noteIntent(grant); });
    if (unnoted) return answered(std::move(unnoted), BusFailureKind::storeUnavailable, operation.get());
  }
  auto error = _keychain.setCredentialForAccount(account, clientID);
  // A revocation does not wait for a keychain that takes its time, so it may have found no token yet. No other operation of the
  // client begins before this one has ended: the token is the one that was stored just now.
  if (!error && operation != nullptr && operation->isRevoked()) {
    error = _keychain.removeCredentialForAccount(account, clientID);
    if (!error) error = operation->unlessRevoked([] { return std::nullopt; });
  }
  return answered(std::move(error), BusFailureKind::keychainUnavailable, operation.get());
}

std::optional<Error> OperationKeychain::removeCredentialForAccount(const std::shared_ptr<Account>& account,
                                                                   const std::optional<std::string>& clientID) {
  return answered(_keychain.removeCredentialForAccount(account, clientID), BusFailureKind::keychainUnavailable,
                  Operation::current());
}

}  // namespace palisade
