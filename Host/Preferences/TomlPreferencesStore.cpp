#include "Host/Preferences/TomlPreferencesStore.h"

#include <sys/inotify.h>
#include <unistd.h>

#include <algorithm>
#include <cstdint>
#include <system_error>

#include "Host/Preferences/TomlFile.h"

namespace palisade {
namespace {

// A domain is a reverse-DNS name; anything else could lead out of the folder.
bool isDomain(std::string_view domain) {
  const auto mayStand = [](char character) {
    return (character >= 'a' && character <= 'z') || (character >= 'A' && character <= 'Z') ||
           (character >= '0' && character <= '9') || character == '.' || character == '-' || character == '_';
  };
  return !domain.empty() && domain.size() <= 200 && domain.front() != '.' && std::ranges::all_of(domain, mayStand);
}

}  // namespace

TomlPreferencesStore::TomlPreferencesStore(std::filesystem::path folder) : _folder(std::move(folder)) {
  std::error_code ignored;
  if (std::filesystem::create_directories(_folder, ignored)) {
    std::filesystem::permissions(_folder, std::filesystem::perms::owner_all, ignored);
  }
  _watch = inotify_init1(IN_CLOEXEC | IN_NONBLOCK);
  watchFolder();
}

TomlPreferencesStore::~TomlPreferencesStore() {
  if (_watch >= 0) close(_watch);
}

std::optional<Value> TomlPreferencesStore::copyValue(std::string_view key, std::string_view domain, PreferencesUser,
                                                     PreferencesHost) {
  const std::lock_guard lock(_mutex);
  forgetWhatChanged();
  const Value* value = read(std::string(domain)).find(key);
  return value == nullptr ? std::nullopt : std::optional(*value);
}

void TomlPreferencesStore::synchronize(std::string_view domain) {
  const std::lock_guard lock(_mutex);
  _domains.erase(std::string(domain));
}

void TomlPreferencesStore::set(std::string_view domain, std::string_view key, const std::optional<Value>& value) {
  const std::lock_guard lock(_mutex);
  setInTomlFile(fileOf(domain), std::string(key), value);
  _domains.erase(std::string(domain));
}

std::filesystem::path TomlPreferencesStore::fileOf(std::string_view domain) const {
  if (!isDomain(domain)) throw TomlError("'" + std::string(domain) + "' is no preferences domain.");
  return _folder / (std::string(domain) + ".toml");
}

const Dictionary& TomlPreferencesStore::read(const std::string& domain) {
  const auto known = _domains.find(domain);
  if (known != _domains.end()) return known->second;
  return _domains.emplace(domain, readTomlFile(fileOf(domain)).value_or(Dictionary())).first->second;
}

void TomlPreferencesStore::watchFolder() {
  constexpr std::uint32_t changes = IN_CREATE | IN_CLOSE_WRITE | IN_MOVED_TO | IN_MOVED_FROM | IN_DELETE;
  _isWatching = _watch >= 0 && inotify_add_watch(_watch, _folder.c_str(), changes | IN_DELETE_SELF | IN_MOVE_SELF) >= 0;
}

void TomlPreferencesStore::forgetWhatChanged() {
  alignas(inotify_event) char events[4096];
  // Without a watch nothing tells of changes, so nothing is remembered.
  bool hasChanged = !_isWatching;
  while (_watch >= 0 && ::read(_watch, events, sizeof events) > 0) hasChanged = true;
  if (!hasChanged) return;
  // The folder of this name may be another one by now, or may have come only now.
  watchFolder();
  _domains.clear();
}

}  // namespace palisade
