#pragma once

/// A string table in memory, alone or laid over another one. See `StringTable`.
///
/// Threads: safe from every thread. Look-ups are not in the trace; `lookups` tells them.

#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "Platform/StringTable.h"
#include "Testing/Instruments.h"

namespace palisade {

class FakeStringTable final : public StringTable {
 public:
  struct Lookup {
    std::string key;
    std::string defaultValue;
    std::string tableName;

    friend bool operator==(const Lookup&, const Lookup&) = default;
  };

  /// `below` answers what was not set here; a null pointer answers the caller's default value.
  FakeStringTable(Instruments instruments, std::shared_ptr<const StringTable> below)
      : _instruments(instruments),
        _below(std::move(below)) {}

  /// Sets a text; none makes the key missing, whatever lies below.
  void set(std::string key, std::optional<std::string> text) {
    const std::lock_guard lock(_mutex);
    _texts.insert_or_assign(std::move(key), std::move(text));
  }

  /// Every look-up so far, in order.
  std::vector<Lookup> lookups() const {
    const std::lock_guard lock(_mutex);
    return _lookups;
  }

  std::string localizedString(std::string_view key, std::string_view defaultValue, std::string_view tableName) const override {
    _instruments.faults.enter("StringTable.localizedString");
    {
      const std::lock_guard lock(_mutex);
      _lookups.push_back({std::string(key), std::string(defaultValue), std::string(tableName)});
      const auto found = _texts.find(key);
      if (found != _texts.end()) return found->second.value_or(std::string(defaultValue));
    }
    return _below == nullptr ? std::string(defaultValue) : _below->localizedString(key, defaultValue, tableName);
  }

 private:
  Instruments _instruments;
  std::shared_ptr<const StringTable> _below;
  mutable std::mutex _mutex;
  std::map<std::string, std::optional<std::string>, std::less<>> _texts;
  mutable std::vector<Lookup> _lookups;
};

}  // namespace palisade
