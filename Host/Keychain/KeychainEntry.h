#pragma once

/// Which entry of the keychain is meant, and how a credential is written.
///
/// Threads: all functions are pure. Errors: `KeychainError`.

#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "Platform/AccountCredential.h"

namespace palisade {

class Account;

/// Says whose entries these are, in attributes and in what the vault's entries are bound to.
inline constexpr std::string_view keychainServiceName = "com.veltran.Accounts1";

struct KeychainEntry {
  std::string accountID;
  std::optional<std::string> clientID;  ///< none: the account's own credential
  std::string username;                 ///< for labels
};

/// Throws `KeychainErrorForeignAccount` unless the account is a `StoredAccount`.
KeychainEntry keychainEntry(const std::shared_ptr<Account>& account, const std::optional<std::string>& clientID);

/// "the credential of org.example.Photos for alice": completes errors and labels.
std::string describe(const KeychainEntry& entry);

/// The credential that the account object holds, as text. It is a secret. Throws `KeychainErrorNotRepresentable`.
std::string secretTextOfCredential(const std::shared_ptr<Account>& account, const KeychainEntry& entry);

/// Throws `KeychainErrorTampered` for what the function above did not write.
std::shared_ptr<const AccountCredential> credentialInSecretText(std::string_view text, const KeychainEntry& entry);

}  // namespace palisade
