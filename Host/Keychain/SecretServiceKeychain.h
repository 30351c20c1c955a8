#pragma once

/// The desktop's own keychain, over the Secret Service: one item a credential in the default collection, with a label for
/// people and the attributes "service", "account", "kind" ("account" or "client") and, for a client's, "client".
///
/// It never asks the user to unlock anything: a locked collection is an error that says so. Secrets cross the bus encrypted; a
/// service that offers only plain sessions is refused.
/// Threads: every operation may be called from any thread; they run one at a time. Errors: see `Keychain`. Without a service
/// the object can be made; its operations fail.

#include <chrono>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "Host/Keychain/Keychain.h"

namespace palisade {

class SecretServiceSession;

class SecretServiceKeychain final : public Keychain {
 public:
  /// How long one operation may wait for the service.
  static constexpr std::chrono::milliseconds ordinaryTimeLimit = std::chrono::seconds{4};

  explicit SecretServiceKeychain(std::chrono::milliseconds timeLimit = ordinaryTimeLimit);
  ~SecretServiceKeychain() override;

  /// Whether a service answers that has a default collection, locked or not.
  bool isPresent();

  std::shared_ptr<const AccountCredential> credentialForAccount(const std::shared_ptr<Account>& account,
                                                                const std::optional<std::string>& clientID) override;
  std::optional<Error> setCredentialForAccount(const std::shared_ptr<Account>& account,
                                               const std::optional<std::string>& clientID) override;
  std::optional<Error> removeCredentialForAccount(const std::shared_ptr<Account>& account,
                                                  const std::optional<std::string>& clientID) override;
  std::vector<std::string> clientIDsWithCredentials(const std::shared_ptr<Account>& account) override;
  std::string description() const override;

 private:
  const std::unique_ptr<SecretServiceSession> _session;
};

}  // namespace palisade
