#pragma once

/// The user's preferences: one TOML file a domain, `DOMAIN.toml`, a key a line. See `PreferencesStore`.
///
/// A file is read when its domain is first asked for, and again when it was changed since: by an editor, by another process, by
/// `set`. The kernel tells of changes (inotify(7)), so an unchanged domain costs no file access.
/// Threads: safe from every thread. Errors: `TomlError` for a file that cannot be read or written; an absent file holds no
/// value.

#include <filesystem>
#include <map>
#include <mutex>

#include "Platform/PreferencesStore.h"

namespace palisade {

class TomlPreferencesStore final : public PreferencesStore {
 public:
  /// The folder is made, for its owner alone, when it is not there.
  explicit TomlPreferencesStore(std::filesystem::path folder);
  ~TomlPreferencesStore() override;

  TomlPreferencesStore(const TomlPreferencesStore&) = delete;
  TomlPreferencesStore& operator=(const TomlPreferencesStore&) = delete;

  std::optional<Value> copyValue(std::string_view key, std::string_view domain, PreferencesUser user,
                                 PreferencesHost host) override;
  void synchronize(std::string_view domain) override;

  /// Writes a value, or removes it when there is none.
  void set(std::string_view domain, std::string_view key, const std::optional<Value>& value);

 private:
  std::filesystem::path fileOf(std::string_view domain) const;
  const Dictionary& read(const std::string& domain);
  void watchFolder();
  void forgetWhatChanged();

  const std::filesystem::path _folder;
  int _watch = -1;
  bool _isWatching = false;
  std::mutex _mutex;
  std::map<std::string, Dictionary> _domains;
};

}  // namespace palisade
