#include "Host/Identity/DesktopEntry.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <cstddef>
#include <cstdlib>

#include "Host/Files/FileDescriptor.h"
#include "Host/Identity/KeyFile.h"

namespace palisade {
namespace {

constexpr std::size_t largestEntry = 1024 * 1024;

std::string environment(const char* variable, const std::string& otherwise) {
  const char* value = std::getenv(variable);
  return value == nullptr || *value == '\0' ? otherwise : value;
}

std::optional<std::string> contentOf(const std::filesystem::path& path) {
  const FileDescriptor file(open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY));
  struct stat status {};
  if (!file.isOpen() || fstat(file.number(), &status) != 0 || !S_ISREG(status.st_mode)) return std::nullopt;
  return readAtMost(file, largestEntry);
}

}  // namespace

std::optional<LocalizedText> nameInDesktopEntry(std::string_view text) {
  const auto file = keyFileFromText(text);
  if (!file) return std::nullopt;
  const auto entry = file->find("Desktop Entry");
  if (entry == file->end()) return std::nullopt;
  const auto name = entry->second.find("Name");
  if (name == entry->second.end()) return std::nullopt;

  constexpr std::string_view localized = "Name[";
  LocalizedText result{.untranslated = name->second};
  for (const auto& [key, value] : entry->second) {
    if (!key.starts_with(localized) || !key.ends_with(']')) continue;
    result.translations.emplace(key.substr(localized.size(), key.size() - localized.size() - 1), value);
  }
  return result;
}

std::vector<std::filesystem::path> dataFolders() {
  const std::string home = environment("XDG_DATA_HOME", environment("HOME", "") + "/.local/share");
  std::string list = home + ":" + environment("XDG_DATA_DIRS", "/usr/local/share:/usr/share") + ":";
  std::vector<std::filesystem::path> folders;
  for (std::size_t end = list.find(':'); end != std::string::npos; end = list.find(':')) {
    const std::filesystem::path folder = list.substr(0, end);
    // A relative folder would depend on where the daemon was started.
    if (folder.is_absolute()) folders.push_back(folder);
    list.erase(0, end + 1);
  }
  return folders;
}

std::optional<LocalizedText> nameInDesktopFile(const std::string& fileName) {
  for (const std::filesystem::path& folder : dataFolders()) {
    const auto content = contentOf(folder / "applications" / fileName);
    if (content) return nameInDesktopEntry(*content);
  }
  return std::nullopt;
}

}  // namespace palisade
