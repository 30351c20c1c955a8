#pragma once

/// What a start of the daemon is told: its command line over accountd.toml over the defaults.
///
/// Threads and ownership: a value. Errors: `std::runtime_error` with a sentence that names the option or the key.

#include <filesystem>
#include <optional>
#include <string>

#include "Host/Alert/SessionAlert.h"
#include "Host/Daemon/AlertCoolDown.h"
#include "Host/Keychain/KeychainChoice.h"
#include "Platform/Log.h"
#include "Platform/Value.h"

namespace palisade {

struct DaemonConfiguration {
  std::filesystem::path plugins;
  /// What asks the user; none takes what the session has.
  std::optional<AlertFrontEnd> alert = std::nullopt;
  /// The terminal on which to ask; none asks on none.
  std::optional<std::string> terminal = std::nullopt;
  /// The display that may be reached over the network; none is.
  std::optional<std::string> display = std::nullopt;
  KeychainChoice keychain = KeychainChoice::automatic;
  LogLevel logLevel = LogLevel::notice;
  AlertCoolDown::Limits coolDown = {};
};

/// `table` is accountd.toml's: plugins, alert (desktop, portal, terminal, nobody), terminal, display, keychain (automatic,
/// secret-service, vault), log (error, notice, debug), and the numbers cool_down_after_refusals and cool_down_minutes.
void applyConfigurationFile(const Dictionary& table, DaemonConfiguration& configuration);

/// What the command line asks for.
enum class CommandLineRequest { serve, help, version };

CommandLineRequest applyCommandLine(int argumentCount, char** arguments, DaemonConfiguration& configuration);

extern const char* const daemonHelp;

}  // namespace palisade
