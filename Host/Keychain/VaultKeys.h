#pragma once

/// The keys of a vault: each is opened when it is first needed, and made when the first credential is stored.
///
/// A key has one half in a file: `keychain.key` in the service manager's credentials folder, or a file of the user's own. The
/// other lies in the session's Secret Service if one answered when the key was made; that it does is written down in the vault
/// and in the key itself, so that a service that is missing or locked later is an error and never a reason to do without.
/// A key whose half is lost or another one stays as it is, with what it has sealed: the right half opens that again. What is
/// stored then is sealed with a new key, whose halves lie beside the old ones.
///
/// Threads: every operation may be called from any thread, and waits for the service for seconds at most. Ownership: a key that
/// was opened stays in guarded memory until this is destroyed, also when the keyring is locked meanwhile. Errors:
/// `KeychainError`: `KeychainErrorKeyLost` for a half that is gone or another one.

#include <cstdint>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "Host/Keychain/KeychainError.h"
#include "Host/Keychain/SecretServiceHalves.h"
#include "Host/Keychain/VaultCipher.h"
#include "Host/Keychain/VaultOptions.h"
#include "Host/Keychain/VaultStore.h"

namespace palisade {

class VaultKeys {
 public:
  VaultKeys(const VaultOptions& options, VaultStore& store);

  using Cipher = std::shared_ptr<const VaultCipher>;
  Cipher cipher(std::int64_t number);

  /// What credentials are sealed with from now on, and its number.
  struct Current {
    std::int64_t number;
    Cipher cipher;
  };
  Current current();

  /// Whether the newest key is made of what the settings ask for. If there is none, it will be.
  bool areAsChosen();

  /// Throws what keeps one of the keys in use from being opened now, whether or not it was opened before.
  void tryAll();

  SecretServiceHalves& service() { return _service; }

 private:
  bool isAsChosen(const VaultKey& key) const;
  Cipher opened(const VaultKey& key);
  void make(const std::optional<VaultKey>& newest);
  bool shallHaveHalfInService(const std::optional<VaultKey>& newest);
  std::map<std::int64_t, Cipher> ciphersInUse();
  std::vector<KeyHalf> halvesInFiles(std::int64_t number) const;
  std::optional<KeyHalf> halfOfServiceManager() const;
  std::filesystem::path ownKeyFile(std::int64_t number) const;
  KeychainError lost(const std::string& reason) const;

  const VaultOptions _options;
  VaultStore& _store;
  SecretServiceHalves _service;
  std::mutex _mutex;
  std::map<std::int64_t, Cipher> _ciphers;  // under _mutex
};

}  // namespace palisade
