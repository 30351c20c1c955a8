#pragma once

/// The vault's file: sealed credentials, and for each key that seals them what it takes to recognise it. No key is in here.
///
/// Threads: every operation may be called from any thread; reads run beside writes. Ownership: owns its connections. Errors:
/// `KeychainError`; after one nothing has changed.

#include <cstdint>
#include <filesystem>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "Host/Keychain/KeychainEntry.h"
#include "Host/Keychain/VaultCipher.h"
#include "Host/Sqlite/Database.h"

namespace palisade {

struct VaultKey {
  std::int64_t number = 0;  ///< 1 is the first; credentials are sealed with the newest
  std::string id;
  bool hasHalfInService = false;
  VaultCipher::Sealed check;  ///< a text that everybody knows, sealed with the key: tells it from every other
};

struct SealedCredential {
  std::int64_t keyNumber = 0;
  VaultCipher::Sealed sealed;
};

class VaultStore {
 public:
  VaultStore(const std::filesystem::path& path, DamagedStore onDamage);
  ~VaultStore();

  const std::filesystem::path& path() const;

  std::optional<VaultKey> newestKey();
  std::optional<VaultKey> key(std::int64_t number);
  /// Those that credentials are sealed with, the newest key in any case.
  std::vector<std::int64_t> keysInUse();

  /// Adds a key, unless another process was faster and has given that number away: false. `sealAnew` is asked for every
  /// credential what it is with the new key, in the same change; none leaves it as it is. It does not call the store.
  using SealAnew =
      std::function<std::optional<VaultCipher::Sealed>(const SealedCredential& credential, const std::string& place)>;
  bool addKey(const VaultKey& key, const SealAnew& sealAnew);

  std::optional<SealedCredential> find(const KeychainEntry& entry);
  void set(const KeychainEntry& entry, const SealedCredential& credential);
  void remove(const KeychainEntry& entry);
  std::vector<std::string> clientIDs(const std::string& accountID);

 private:
  struct Rows;

  const std::unique_ptr<Rows> _rows;
};

/// What a credential is bound to. Unlike entries have unlike places.
std::string placeOf(const KeychainEntry& entry);

}  // namespace palisade
