#pragma once

/// Loads a plug-in module and checks everything that can be checked before its plug-in is made.
///
/// A module runs with all of the daemon's rights from the moment it is loaded. So the file is looked at first: nobody but root
/// and the daemon's own user may be able to change or replace it, and it must be complete, because mapping a file that was cut
/// off ends the process instead of failing.
/// Threads: safe from every thread. Ownership: a loaded module stays until the process ends; there is no unloading, because its
/// callbacks and registrations outlive every object.
/// Errors: `PluginLoadError`. A module that was refused after it had been loaded (from the entry point on) stays in memory,
/// unused.

#include <filesystem>
#include <stdexcept>

#include "Platform/AccountAccessPlugin.h"

namespace palisade {

/// `what()` is one sentence for an administrator: which file, what is wrong with it, and what to do.
class PluginLoadError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

struct LoadedPlugin {
  /// Absolute and without symbolic links: the module's resources lie beside this file.
  std::filesystem::path path;
  /// Of this daemon's ABI number and complete. Never null.
  const AccountAccessPluginModule* module;
};

LoadedPlugin loadPlugin(const std::filesystem::path& path);

}  // namespace palisade
