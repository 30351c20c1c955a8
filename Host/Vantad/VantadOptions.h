#pragma once

/// The command line of vantad. Pure but for the environment. Errors: `std::invalid_argument` with a sentence for the user.

#include <filesystem>
#include <string>

#include "Host/Keychain/OpenKeychain.h"

namespace palisade {

struct VantadOptions {
  bool wantsHelp = false;
  bool isVerbose = false;
  std::filesystem::path state;
  std::filesystem::path configuration;
  KeychainChoice keychain = KeychainChoice::automatic;

  std::filesystem::path outbox() const { return state / "outbox.sqlite"; }
  std::filesystem::path lock() const { return state / "vantad.lock"; }
  KeychainOptions keychainOptions() const;
};

VantadOptions parseVantadOptions(int count, char** words);

std::string vantadHelp();

}  // namespace palisade
