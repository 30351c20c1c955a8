#include "Host/Daemon/Paths.h"

#include <cstdlib>
#include <sstream>
#include <stdexcept>
#include <string>

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

}  // namespace

std::filesystem::path stateFolder() { return baseDirectory("XDG_STATE_HOME", ".local/state"); }
std::filesystem::path configurationFolder() { return baseDirectory("XDG_CONFIG_HOME", ".config"); }

std::vector<std::filesystem::path> clientRecordFolders() {
  std::vector<std::filesystem::path> folders{"/etc/palisade/clients",
                                             baseDirectory("XDG_DATA_HOME", ".local/share") / "clients"};
  std::string dataFolders = environment("XDG_DATA_DIRS");
  if (dataFolders.empty()) dataFolders = "/usr/local/share:/usr/share";
  std::istringstream list(dataFolders);
  for (std::string folder; std::getline(list, folder, ':');) {
    if (std::filesystem::path(folder).is_absolute()) folders.push_back(std::filesystem::path(folder) / "palisade/clients");
  }
  return folders;
}

}  // namespace palisade
