#pragma once

/// What vantad is told: its command line over accountd.toml over the defaults.
///
/// Threads and ownership: a value. Errors: `std::invalid_argument` with a sentence for the user.

#include <filesystem>
#include <optional>
#include <string>

#include "Host/Keychain/VaultOptions.h"
#include "Platform/Log.h"
#include "Platform/Value.h"

namespace palisade {

struct VantadOptions {
  enum class Request { serve, help, version };

  Request request = Request::serve;
  std::filesystem::path state;
  /// server.toml.
  std::filesystem::path configuration;
  /// accountd.toml: beside a server.toml that was named, otherwise wherever the account daemon finds it.
  std::filesystem::path accountdConfiguration;
  std::optional<KeychainChoice> keychain;
  std::optional<LogLevel> logLevel;

  /// Takes what the command line left open. The keychain has to be the account daemon's.
  void takeDefaultsFrom(const Dictionary& accountdTable);

  std::filesystem::path outbox() const { return state / "outbox.sqlite"; }
  VaultOptions vaultOptions() const;
};

VantadOptions parseVantadOptions(int count, char** words);

std::string vantadHelp();

}  // namespace palisade
