#include "Host/Daemon/Paths.h"

#include <cstdlib>
#include <sstream>
#include <stdexcept>
#include <string>
#include <system_error>

namespace palisade {
namespace {

std::string environment(const char* name) {
  const char* value = std::getenv(name);
  return value == nullptr ? "" : value;
}

// A base directory that is not absolute is to be ignored.
std::filesystem::path baseDirectory(const char* variable, const char* belowHome) {
  const std::filesystem::path directory = environment(variable);
  if (directory.is_absolute()) return directory / "palisade";
  const std::filesystem::path home = environment("HOME");
  if (!home.is_absolute()) throw std::runtime_error(std::string("Neither ") + variable + " nor HOME is set to a folder.");
  return home / belowHome / "palisade";
}

// The "palisade" folders of a list of base directories; those that are not absolute are to be ignored.
std::vector<std::filesystem::path> searchedFolders(const char* variable, const char* otherwise) {
  std::string directories = environment(variable);
  if (directories.empty()) directories = otherwise;
  std::vector<std::filesystem::path> folders;
  std::istringstream list(directories);
  for (std::string directory; std::getline(list, directory, ':');) {
    if (std::filesystem::path(directory).is_absolute()) folders.push_back(std::filesystem::path(directory) / "palisade");
  }
  return folders;
}

}  // namespace

std::filesystem::path stateFolder() { return baseDirectory("XDG_STATE_HOME", ".local/state"); }
std::filesystem::path configurationFolder() { return baseDirectory("XDG_CONFIG_HOME", ".config"); }

std::filesystem::path configurationFile(const std::string& name) {
  std::filesystem::path own = configurationFolder() / name;
  std::error_code error;
  if (std::filesystem::exists(own, error)) return own;
  for (const auto& folder : searchedFolders("XDG_CONFIG_DIRS", "/usr/local/etc/xdg:/etc/xdg")) {
    if (std::filesystem::exists(folder / name, error)) return folder / name;
  }
  return own;
}

std::vector<std::filesystem::path> clientRecordFolders() {
  std::vector<std::filesystem::path> folders{"/etc/palisade/clients",
                                             baseDirectory("XDG_DATA_HOME", ".local/share") / "clients"};
  for (const auto& folder : searchedFolders("XDG_DATA_DIRS", "/usr/local/share:/usr/share"))
    folders.push_back(folder / "clients");
  return folders;
}

std::vector<std::filesystem::path> systemClientRecordFolders() {
  return {"/etc/palisade/clients", "/usr/local/share/palisade/clients", "/usr/share/palisade/clients"};
}

}  // namespace palisade
