#pragma once

/// Opens the keychain that the user has chosen, or finds out which one this host has.
///
/// The automatic choice takes the Secret Service when one answers that has a default keyring, else the vault, and writes down
/// what it took: credentials do not move, so the same keychain is used ever after, and one that is missing or locked later is
/// an error and not a reason to look into the other. Threads: once, at start. Errors: `KeychainError`. There is no plain
/// storage to fall back to.

#include <chrono>
#include <filesystem>
#include <memory>
#include <optional>
#include <string_view>

#include "Host/Keychain/Keychain.h"
#include "Host/Keychain/VaultKeychain.h"

namespace palisade {

enum class KeychainChoice { automatic, secretService, vault };

/// "automatic", "secret-service" or "vault"; none for every other word.
std::optional<KeychainChoice> keychainChoiceNamed(std::string_view name);
std::string_view nameOf(KeychainChoice choice);

struct KeychainOptions {
  KeychainChoice choice = KeychainChoice::automatic;
  VaultOptions vault;
  std::filesystem::path choiceFile;  ///< where the automatic choice is written down
};

std::unique_ptr<Keychain> openKeychain(const KeychainOptions& options);

}  // namespace palisade
