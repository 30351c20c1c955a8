#pragma once

/// The localised texts of one bundle: a plug-in gets the tables that ship beside its own module.
///
/// Threads: safe from every thread. Each look-up follows the user's language of that moment, so nothing is cached by callers.
/// Errors: none. A missing key, table or language falls back to English and then to the caller's default value.

#include <string>
#include <string_view>

namespace palisade {

class StringTable {
 public:
  virtual ~StringTable() = default;

  virtual std::string localizedString(std::string_view key, std::string_view defaultValue,
                                      std::string_view tableName) const = 0;
};

}  // namespace palisade
