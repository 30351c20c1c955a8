#pragma once

/// A string table whose texts show which key was looked up and what was put into it.
///
/// A text without placeholders is its key in brackets, a format is its key with its arguments in angle brackets:
/// `[POST_PRIVATELY]`, `ACCOUNT_ACCESS_TWO_PERMISSION_FORMAT<Photos; a; b>`. An argument too many would stand right before the
/// closing bracket. `text` and `shown` write what a test expects.
/// Threads: safe from every thread.

#include <initializer_list>
#include <map>
#include <string>
#include <string_view>

#include "Platform/StringTable.h"

namespace palisade {

/// How many placeholders a format has; 0 for a text that is none.
inline std::size_t placeholdersOf(std::string_view key) {
  static const std::map<std::string, std::size_t, std::less<>> formats{
      {"ACCOUNT_ACCESS_BASIC_MESSAGE", 1},
      {"ACCOUNT_ACCESS_ONE_PERMISSION_SHORT_FORMAT", 2},
      {"ACCOUNT_ACCESS_ONE_PERMISSION_FORMAT", 2},
      {"ACCOUNT_ACCESS_TWO_PERMISSION_FORMAT", 3},
      {"ACCOUNT_ACCESS_THREE_PERMISSION_FORMAT", 4},
      {"ACCOUNT_ACCESS_UNKNOWN_FORMAT", 2},
      {"ACCOUNT_ACCESS_UNKNOWN_ADDITIONAL_FORMAT", 1},
      {"ACCOUNT_ACCESS_EXTENDED_READ_MULTIPLE", 2},
      {"ACCOUNT_ACCESS_EXTENDED_READ", 1},
      {"ACCCOUNT_ACCESS_WRITE", 1},
      {"ACCOUNT_ACCESS_MANAGE", 1},
      {"ACCOUNT_ACCESS_MANAGE_MULTIPLE", 2},
      {"ACCOUNT_ACCESS_EXTENDED_READ_USER", 1},
      {"ACCOUNT_ACCESS_EXTENDED_READ_USER_MULTIPLE", 2},
      {"ACCOUNT_ACCESS_EXTENDED_READ_FRIENDS", 1},
      {"ACCOUNT_ACCESS_EXTENDED_READ_FRIENDS_MULTIPLE", 2},
  };
  const auto found = formats.find(key);
  return found == formats.end() ? 0 : found->second;
}

inline std::string text(std::string_view key) { return "[" + std::string(key) + "]"; }

inline std::string shown(std::string_view key, std::initializer_list<std::string> arguments) {
  std::string result = std::string(key) + "<";
  for (const std::string& argument : arguments) result += (&argument == arguments.begin() ? "" : "; ") + argument;
  return result + ">";
}

class ShownTexts final : public StringTable {
 public:
  std::string localizedString(std::string_view key, std::string_view, std::string_view) const override {
    const std::size_t placeholders = placeholdersOf(key);
    if (placeholders == 0) return text(key);
    std::string format = std::string(key) + "<%@";
    for (std::size_t further = 1; further < placeholders; ++further) format += "; %@";
    return format + "%@>";
  }
};

// The names and lists that occur in most expectations.

inline std::string readName(std::string_view upperCasedPermission) {
  return text("FACEBOOK_READ_PERMISSION_" + std::string(upperCasedPermission));
}
inline std::string manageName(std::string_view upperCasedPermission) {
  return text("FACEBOOK_MANAGE_PERMISSION_" + std::string(upperCasedPermission));
}
inline std::string separated(std::initializer_list<std::string> names) {
  std::string list;
  for (const std::string& name : names) list += (&name == names.begin() ? "" : text("WORD_LIST_SEPARATOR")) + name;
  return list;
}

}  // namespace palisade
