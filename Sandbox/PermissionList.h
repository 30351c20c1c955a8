#pragma once

/// The permissions that the sandbox's server knows, with the words for those that clients cannot put into words themselves.
///
/// Threads: read-only once made. Errors: a file that cannot be read, or a line that names nothing, is a `std::runtime_error`
/// that says which.

#include <filesystem>
#include <map>
#include <optional>
#include <string>
#include <string_view>

namespace palisade::sandbox {

class PermissionList {
 public:
  /// The permissions of the catalogue that clients have, and a few that are not in it.
  static PermissionList builtIn();

  /// One permission a line: its name and, after a blank, the words for it. "#" begins a comment.
  static PermissionList fromFile(const std::filesystem::path& path);

  bool knows(std::string_view name) const { return _words.find(name) != _words.end(); }

  /// None for a permission that is unknown or has no words.
  std::optional<std::string> wordsFor(std::string_view name) const;

 private:
  void add(std::string_view name, std::string_view words);

  std::map<std::string, std::string, std::less<>> _words;
};

}  // namespace palisade::sandbox
