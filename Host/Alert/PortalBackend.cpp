// Preferences come first: the first portals.conf that there is decides, by its line for the interface, else by its default, and
// "none" there is final. Without a preference that can be met it is the backend that names the desktop in UseIn, then GTK's,
// which desktops without a backend of their own have always used, then whichever there is.

#include "Host/Alert/PortalBackend.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <map>
#include <system_error>

#include "Host/Files/FileDescriptor.h"
#include "Host/Identity/DesktopEntry.h"
#include "Host/Identity/KeyFile.h"

namespace palisade {
namespace {

using Folders = std::vector<std::filesystem::path>;

constexpr std::size_t largestPortalFile = 64 * 1024;
constexpr const char* portalFolder = "xdg-desktop-portal";
constexpr std::string_view backendOfGtk = "org.freedesktop.impl.portal.desktop.gtk";

struct Backend {
  std::string busName;
  std::vector<std::string> useIn;
};

/// Those that serve access questions, by the names that preferences have for them.
using Backends = std::map<std::string, Backend, std::less<>>;

std::string variableOr(const char* name, const std::string& otherwise) {
  const char* value = std::getenv(name);
  return value == nullptr || *value == '\0' ? otherwise : value;
}

std::vector<std::string> split(std::string_view list, char separator) {
  std::vector<std::string> parts;
  while (!list.empty()) {
    const std::size_t end = std::min(list.find(separator), list.size());
    if (end > 0) parts.emplace_back(list.substr(0, end));
    list.remove_prefix(std::min(end + 1, list.size()));
  }
  return parts;
}

bool isLetterOrDigit(char byte) {
  return (byte >= 'a' && byte <= 'z') || (byte >= 'A' && byte <= 'Z') || (byte >= '0' && byte <= '9');
}

std::string inSmallLetters(std::string text) {
  for (char& byte : text) {
    if (byte >= 'A' && byte <= 'Z') byte = static_cast<char>(byte | 0x20);
  }
  return text;
}

// A name becomes part of a file's name.
bool isDesktopName(std::string_view name) {
  return std::ranges::all_of(name, [](char byte) { return isLetterOrDigit(byte) || byte == '-' || byte == '_'; });
}

// A name becomes part of a match rule of the bus.
bool isWellKnownBusName(std::string_view name) {
  return name.size() <= 255 && name.find('.') != std::string_view::npos && name.front() != '.' &&
         std::ranges::all_of(name,
                             [](char byte) { return isLetterOrDigit(byte) || byte == '-' || byte == '_' || byte == '.'; });
}

std::optional<KeyFileGroup> groupIn(const std::filesystem::path& path, std::string_view group) {
  const FileDescriptor file(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY));
  struct stat status {};
  if (!file.isOpen() || fstat(file.number(), &status) != 0 || !S_ISREG(status.st_mode)) return std::nullopt;
  const auto text = readAtMost(file, largestPortalFile);
  const auto groups = text ? keyFileFromText(*text) : std::nullopt;
  if (!groups) return std::nullopt;
  const auto found = groups->find(group);
  return found == groups->end() ? std::nullopt : std::optional(found->second);
}

std::vector<std::string> listIn(const KeyFileGroup& group, std::string_view key) {
  const auto found = group.find(key);
  return found == group.end() ? std::vector<std::string>() : split(found->second, ';');
}

Folders configurationFolders() {
  Folders folders{variableOr("XDG_CONFIG_HOME", variableOr("HOME", "") + "/.config")};
  for (const std::string& folder : split(variableOr("XDG_CONFIG_DIRS", "/etc/xdg") + ":/etc", ':'))
    folders.emplace_back(folder);
  // A relative folder would depend on where the daemon was started.
  std::erase_if(folders, [](const auto& folder) { return !folder.is_absolute(); });
  return folders;
}

Backends installedBackends(const Folders& folders) {
  std::map<std::string, std::optional<Backend>> found;
  for (const std::filesystem::path& folder : folders) {
    std::error_code missing;
    for (const auto& entry : std::filesystem::directory_iterator(folder / portalFolder / "portals", missing)) {
      const std::filesystem::path& path = entry.path();
      // A file of the same name in a folder that is more important stands in front of this one.
      if (path.extension() != ".portal" || found.contains(path.stem())) continue;
      auto& backend = found[path.stem()];
      const auto portal = groupIn(path, "portal");
      if (!portal || !portal->contains("DBusName")) continue;
      const std::string& busName = portal->find("DBusName")->second;
      if (!isWellKnownBusName(busName) || std::ranges::count(listIn(*portal, "Interfaces"), accessInterface) == 0) continue;
      backend = Backend{.busName = busName, .useIn = listIn(*portal, "UseIn")};
    }
  }
  Backends backends;
  for (auto& [name, backend] : found) {
    if (backend) backends.emplace(name, std::move(*backend));
  }
  return backends;
}

KeyFileGroup preferencesIn(const Folders& folders, const std::vector<std::string>& desktops) {
  for (const std::filesystem::path& folder : folders) {
    std::vector<std::string> names;
    for (const std::string& desktop : desktops) names.push_back(desktop + "-portals.conf");
    names.emplace_back("portals.conf");
    for (const std::string& name : names) {
      if (auto preferred = groupIn(folder / portalFolder / name, "preferred")) return std::move(*preferred);
    }
  }
  return {};
}

const Backend* firstNamed(const std::vector<std::string>& names, const Backends& backends) {
  for (const std::string& name : names) {
    if (name == "*" && !backends.empty()) return &backends.begin()->second;
    const auto found = backends.find(name);
    if (found != backends.end()) return &found->second;
  }
  return nullptr;
}

const Backend* usedIn(const std::string& desktop, const Backends& backends) {
  for (const auto& [name, backend] : backends) {
    if (std::ranges::any_of(backend.useIn, [&](const auto& named) { return inSmallLetters(named) == desktop; }))
      return &backend;
  }
  return nullptr;
}

const Backend* unpreferred(const std::vector<std::string>& desktops, const Backends& backends) {
  for (const std::string& desktop : desktops) {
    if (const Backend* backend = usedIn(desktop, backends)) return backend;
  }
  for (const auto& [name, backend] : backends) {
    if (backend.busName == backendOfGtk) return &backend;
  }
  return backends.empty() ? nullptr : &backends.begin()->second;
}

}  // namespace

std::vector<std::string> currentDesktops() {
  std::vector<std::string> desktops = split(inSmallLetters(variableOr("XDG_CURRENT_DESKTOP", "")), ':');
  std::erase_if(desktops, [](const std::string& name) { return !isDesktopName(name); });
  return desktops;
}

std::optional<std::string> accessBackend() {
  const std::vector<std::string> desktops = currentDesktops();
  const Folders data = dataFolders();
  const Backends backends = installedBackends(data);

  Folders searched = configurationFolders();
  searched.insert(searched.end(), data.begin(), data.end());
  const KeyFileGroup preferences = preferencesIn(searched, desktops);
  const std::vector<std::string> ofInterface = listIn(preferences, accessInterface);
  const std::vector<std::string> otherwise = listIn(preferences, "default");
  if (std::ranges::count(ofInterface.empty() ? otherwise : ofInterface, "none") > 0) return std::nullopt;

  const Backend* backend = firstNamed(ofInterface, backends);
  if (backend == nullptr) backend = firstNamed(otherwise, backends);
  if (backend == nullptr) backend = unpreferred(desktops, backends);
  return backend == nullptr ? std::nullopt : std::optional(backend->busName);
}

}  // namespace palisade
