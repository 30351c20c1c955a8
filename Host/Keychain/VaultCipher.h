#pragma once

/// The vault's key and what it does: seals a secret for one place, and opens it there only (XChaCha20-Poly1305, a random nonce
/// a message).
///
/// Threads: immutable after construction, safe from every thread. Ownership: the key lies in guarded memory that is wiped when
/// the cipher is destroyed. Errors: `KeychainError`.

#include <cstddef>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

namespace palisade {

class VaultCipher {
 public:
  static constexpr std::size_t keySize = 32;

  /// Reads the key from a file that holds nothing else.
  enum class KeyFile {
    ownKey,           ///< a file of this user's that nobody else may read
    systemCredential  ///< a file that the service manager has put there for us
  };
  VaultCipher(const std::filesystem::path& keyFile, KeyFile kind);

  /// Makes a key file with a new key, readable for this user only, unless there is one.
  static void createKeyFile(const std::filesystem::path& keyFile);

  struct Sealed {
    std::string nonce;
    std::string ciphertext;
  };

  /// `place` is bound to the result and not stored in it.
  Sealed seal(std::string_view secret, std::string_view place) const;

  /// None when the sealed text is not what was sealed for this place with this key.
  std::optional<std::string> open(const Sealed& sealed, std::string_view place) const;

 private:
  struct GuardedFree {
    void operator()(unsigned char* memory) const;
  };

  std::unique_ptr<unsigned char[], GuardedFree> _key;
};

}  // namespace palisade
