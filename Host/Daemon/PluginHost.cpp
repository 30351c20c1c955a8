#include "Host/Daemon/PluginHost.h"

#include <algorithm>
#include <system_error>

#include "Host/Strings/GettextStringTable.h"

namespace palisade {
namespace {

constexpr const char* usualTable = "Localizable";

}  // namespace

PluginHost::PluginHost(const std::filesystem::path& folder, const PlatformServices& services) {
  std::error_code error;
  std::vector<std::filesystem::path> modules;
  for (const auto& entry : std::filesystem::directory_iterator(folder, error)) {
    modules.push_back(entry.path() / (entry.path().filename().string() + ".so"));
  }
  if (error) _troubles.push_back("The plug-in folder " + folder.string() + " cannot be read: " + error.message() + ".");
  std::ranges::sort(modules);
  for (const auto& module : modules) {
    try {
      load(module, services);
    } catch (const PluginLoadError& refusal) {
      _troubles.emplace_back(refusal.what());
    }
  }
}

void PluginHost::load(const std::filesystem::path& module, PlatformServices services) {
  const LoadedPlugin loaded = loadPlugin(module);
  auto strings = std::make_shared<GettextStringTable>(loaded.path.parent_path() / "Resources");
  // The texts are read while nobody waits: whoever needs the first of them may be the thread that reads the bus.
  strings->localizedString("any", "", usualTable);
  services.strings = strings.get();
  auto plugin = loaded.module->create(services);
  if (plugin == nullptr) throw PluginLoadError(loaded.path.string() + " made no plug-in object. Rebuild it for this daemon.");
  _entries.push_back({.loaded = loaded, .strings = std::move(strings), .plugin = std::move(plugin)});
}

std::shared_ptr<AccountAccessPlugin> PluginHost::pluginFor(std::string_view accountType) const {
  for (const Entry& entry : _entries) {
    if (entry.loaded.module->supportsAccountTypeWithIdentifier(accountType)) return entry.plugin;
  }
  return nullptr;
}

std::vector<std::string> PluginHost::modules() const {
  std::vector<std::string> paths;
  paths.reserve(_entries.size());
  for (const Entry& entry : _entries) paths.push_back(entry.loaded.path.string());
  return paths;
}

}  // namespace palisade
