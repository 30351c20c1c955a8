#pragma once

/// Why a credential could not be read, written or removed: a sentence for people, and a code for programs.
///
/// Threads: an exception, thrown and caught on one thread. Ownership: a value. The text never holds a secret.

#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>

#include "Platform/Error.h"

namespace palisade {

inline constexpr std::string_view KeychainErrorDomain = "KeychainErrorDomain";

/// Codes in `KeychainErrorDomain`.
enum KeychainErrorCode : int {
  KeychainErrorLocked = 1,            ///< the keychain is there and has to be unlocked first
  KeychainErrorUnavailable = 2,       ///< there is no keychain, or it refuses to work
  KeychainErrorTimeout = 3,           ///< it did not answer in time
  KeychainErrorTampered = 4,          ///< an entry is not what was written for this account and client
  KeychainErrorKey = 5,               ///< the vault's key file is too open, or no key file
  KeychainErrorNotRepresentable = 6,  ///< a credential that would not read back as it was written, or none at all
  KeychainErrorForeignAccount = 7,    ///< an account object that is not out of the daemon's store
  KeychainErrorStorage = 8,           ///< the vault's file cannot be read or written
  KeychainErrorKeyLost = 9,           ///< half of the vault's key is gone or another one; what is stored anew has a new key
};

class KeychainError : public std::runtime_error {
 public:
  KeychainError(KeychainErrorCode code, const std::string& text) : std::runtime_error(text), _code(code) {}

  KeychainErrorCode code() const { return _code; }

  /// The same for callers that are answered an error instead of an exception.
  Error error() const { return {.domain = std::string(KeychainErrorDomain), .code = _code, .description = what()}; }

 private:
  KeychainErrorCode _code;
};

/// Does `work`; answers the keychain error that it ends with, or none.
template <typename Work>
std::optional<Error> keychainAnswer(Work work) {
  try {
    work();
  } catch (const KeychainError& error) {
    return error.error();
  }
  return std::nullopt;
}

}  // namespace palisade
