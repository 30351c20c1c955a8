#pragma once

/// The keychain of a host without a Secret Service: credentials in a store of their own, each sealed with the vault's key for
/// the account and client that it belongs to. A row that is copied to another account or client does not open.
///
/// The key is `keychain.key` in the service manager's credentials folder when there is one, else a file of the user's own that
/// is made at first use. Whoever can read that file and the store can read the credentials: the vault protects copies of the
/// store, not a session that runs as the user. Nor does it notice that a whole row was put back to what it was earlier.
///
/// Threads: every operation may be called from any thread; reads run beside writes. Errors: see `Keychain`. A missing key is
/// never replaced while there are credentials that it was made for.

#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "Host/Keychain/Keychain.h"
#include "Host/Sqlite/Database.h"

namespace palisade {

struct VaultOptions {
  std::filesystem::path path;
  std::filesystem::path keyFile;
  std::optional<std::filesystem::path> credentialsFolder = std::nullopt;  ///< `$CREDENTIALS_DIRECTORY`
  DamagedStore onDamage = DamagedStore::refuse;
};

class VaultKeychain final : public Keychain {
 public:
  /// Throws `KeychainError`.
  explicit VaultKeychain(const VaultOptions& options);
  ~VaultKeychain() override;

  std::shared_ptr<const AccountCredential> credentialForAccount(const std::shared_ptr<Account>& account,
                                                                const std::optional<std::string>& clientID) override;
  std::optional<Error> setCredentialForAccount(const std::shared_ptr<Account>& account,
                                               const std::optional<std::string>& clientID) override;
  std::optional<Error> removeCredentialForAccount(const std::shared_ptr<Account>& account,
                                                  const std::optional<std::string>& clientID) override;
  std::vector<std::string> clientIDsWithCredentials(const std::shared_ptr<Account>& account) override;
  std::string description() const override;

 private:
  struct Vault;

  const std::unique_ptr<Vault> _vault;
};

}  // namespace palisade
