#pragma once

/// Where a vault lies and what its key is made of.
///
/// Threads and ownership: a value.

#include <chrono>
#include <filesystem>
#include <optional>

#include "Host/Keychain/KeychainChoice.h"
#include "Host/Sqlite/Database.h"

namespace palisade {

struct VaultOptions {
  KeychainChoice choice = KeychainChoice::automatic;
  std::filesystem::path path;
  std::filesystem::path keyFile;                                          ///< of the first key; ".2" is added for the second
  std::optional<std::filesystem::path> credentialsFolder = std::nullopt;  ///< `$CREDENTIALS_DIRECTORY`
  DamagedStore onDamage = DamagedStore::refuse;
  std::chrono::milliseconds serviceTimeLimit = std::chrono::seconds{4};
};

}  // namespace palisade
