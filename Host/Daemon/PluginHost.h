#pragma once

/// The plug-ins of one folder: each sub-folder holds a module and its Resources.
///
/// Threads: loaded once, at start; `pluginFor` from any thread. Ownership: plug-in objects are shared; modules stay until the
/// process ends. Errors: a module that cannot be used is left out and told in `troubles`.

#include <filesystem>
#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "Host/Daemon/PluginLoader.h"
#include "Platform/AccountAccessPlugin.h"
#include "Platform/StringTable.h"

namespace palisade {

class PluginHost {
 public:
  /// `services` lacks only the string table, which every module has of its own.
  PluginHost(const std::filesystem::path& folder, const PlatformServices& services);

  /// The plug-in that serves an account type, or null.
  std::shared_ptr<AccountAccessPlugin> pluginFor(std::string_view accountType) const;

  /// The modules that were loaded.
  std::vector<std::string> modules() const;
  const std::vector<std::string>& troubles() const { return _troubles; }

 private:
  struct Entry {
    LoadedPlugin loaded;
    std::shared_ptr<const StringTable> strings;
    std::shared_ptr<AccountAccessPlugin> plugin;
  };

  void load(const std::filesystem::path& module, PlatformServices services);

  std::vector<Entry> _entries;
  std::vector<std::string> _troubles;
};

}  // namespace palisade
