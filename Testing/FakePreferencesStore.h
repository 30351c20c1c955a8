#pragma once

/// Preferences in memory. See `PreferencesStore`. Threads: safe from every thread.

#include <map>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "Platform/PreferencesStore.h"
#include "Testing/Instruments.h"

namespace palisade {

class FakePreferencesStore final : public PreferencesStore {
 public:
  explicit FakePreferencesStore(Instruments instruments) : _instruments(instruments) {}

  /// Sets a preference, as the user or another program does; none takes it away. Not traced.
  void set(std::string_view key, std::string_view domain, std::optional<Value> value);

  std::optional<Value> copyValue(std::string_view key, std::string_view domain, PreferencesUser user,
                                 PreferencesHost host) override;
  void synchronize(std::string_view domain) override;

 private:
  using Key = std::pair<std::string, std::string>;

  Instruments _instruments;
  std::mutex _mutex;
  std::map<Key, Value> _values;
};

}  // namespace palisade
