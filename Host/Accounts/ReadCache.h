#pragma once

/// Keeps what was read until something is written: a request that a grant answers then needs no query.
///
/// The store belongs to one daemon, and every write goes through it, so a kept value is the stored one. A value is kept only if
/// nothing was written while it was being read; a bounded number of them is.
/// Threads: any; nothing is held while a value is read. Ownership: keeps values, hands out copies. Errors: those of the
/// reading, after which nothing is kept.

#include <cstddef>
#include <cstdint>
#include <map>
#include <mutex>
#include <optional>
#include <string>

namespace palisade {

template <typename Value>
class ReadCache {
 public:
  /// The value under a key: the kept one, or what `read` answers. None is not kept.
  template <typename Read>
  std::optional<Value> get(const std::string& key, const Read& read) {
    std::uint64_t version = 0;
    {
      const std::lock_guard lock(_mutex);
      const auto kept = _values.find(key);
      if (kept != _values.end()) return kept->second;
      version = _version;
    }
    std::optional<Value> value = read();
    if (value) {
      const std::lock_guard lock(_mutex);
      if (_values.size() >= greatestSize) _values.clear();
      if (_version == version) _values.insert_or_assign(key, *value);
    }
    return value;
  }

  /// To be called after each write, before it is acknowledged.
  void forget() {
    const std::lock_guard lock(_mutex);
    ++_version;
    _values.clear();
  }

 private:
  static constexpr std::size_t greatestSize = 1000;

  std::mutex _mutex;
  std::map<std::string, Value> _values;
  std::uint64_t _version = 0;
};

}  // namespace palisade
