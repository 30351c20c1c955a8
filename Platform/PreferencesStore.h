#pragma once

/// The user's preferences: typed values under a key in a domain.
///
/// Threads: one domain is read and synchronised from one queue; different domains from any thread.
/// Errors: a value that was never set is none. A store that cannot be read throws.

#include <optional>
#include <string_view>

#include "Platform/Value.h"

namespace palisade {

enum class PreferencesUser { current };
enum class PreferencesHost { any };

class PreferencesStore {
 public:
  virtual ~PreferencesStore() = default;

  virtual std::optional<Value> copyValue(std::string_view key, std::string_view domain, PreferencesUser user,
                                         PreferencesHost host) = 0;

  /// Flushes what this process wrote and makes the next read see what others wrote.
  virtual void synchronize(std::string_view domain) = 0;
};

}  // namespace palisade
