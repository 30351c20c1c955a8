#pragma once

/// The daemons' keychain: credentials in a store of their own, always, each sealed for the account and client that it belongs
/// to. A row that is copied to another account or client does not open.
///
/// Whoever reads the session's Secret Service lacks the key's other half and the store; whoever has the disk lacks the
/// service's half. A program that reaches both, or both files of a vault without a half in the service, can read the
/// credentials: the vault is no wall against what runs as the user outside a sandbox. Nor does it notice that a whole row was
/// put back to what it was earlier. See `VaultKeys` for what becomes of a key.
///
/// Threads: every operation may be called from any thread; reads run beside writes. Errors: see `Keychain`. The vault opens
/// without its keys: what needs none, such as a removal, works also when they are lost.

#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "Host/Keychain/Keychain.h"
#include "Host/Keychain/VaultOptions.h"

namespace palisade {

class VaultKeychain final : public Keychain {
 public:
  /// Throws `KeychainError` when the store cannot be opened.
  explicit VaultKeychain(const VaultOptions& options);
  ~VaultKeychain() override;

  std::shared_ptr<const AccountCredential> credentialForAccount(const std::shared_ptr<Account>& account,
                                                                const std::optional<std::string>& clientID) override;
  std::optional<Error> setCredentialForAccount(const std::shared_ptr<Account>& account,
                                               const std::optional<std::string>& clientID) override;
  std::optional<Error> removeCredentialForAccount(const std::shared_ptr<Account>& account,
                                                  const std::optional<std::string>& clientID) override;
  std::vector<std::string> clientIDsWithCredentials(const std::shared_ptr<Account>& account) override;
  std::string description() override;
  std::optional<std::string> trouble() override;

  /// Brings what is stored in line with the settings: credentials are sealed with a key as it was chosen, and those that
  /// earlier versions left in the Secret Service go. Waits for the service for seconds. Answers sentences for the log.
  std::vector<std::string> tidy();

 private:
  struct Vault;

  const std::unique_ptr<Vault> _vault;
};

}  // namespace palisade
