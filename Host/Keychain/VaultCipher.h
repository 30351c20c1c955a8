#pragma once

/// The vault's key and what it does: seals a secret for one place, and opens it there only (XChaCha20-Poly1305, a random nonce
/// a message).
///
/// The key is a hash of its halves and its ID, so all of them are needed, and a key of one half is another key than one of two.
/// Threads: immutable after construction, safe from every thread. Ownership: the key lies in guarded memory that is wiped when
/// the cipher is destroyed. Errors: `KeychainError`.

#include <optional>
#include <string>
#include <string_view>

#include "Host/Keychain/KeyHalf.h"

namespace palisade {

class VaultCipher {
 public:
  /// `inService` is null for a key that the file's half makes alone.
  VaultCipher(std::string_view keyID, const KeyHalf& inFile, const KeyHalf* inService);

  struct Sealed {
    std::string nonce;
    std::string ciphertext;
  };

  /// `place` is bound to the result and not stored in it.
  Sealed seal(std::string_view secret, std::string_view place) const;

  /// None when the sealed text is not what was sealed for this place with this key.
  std::optional<std::string> open(const Sealed& sealed, std::string_view place) const;

 private:
  KeyHalf _key;
};

}  // namespace palisade
