#pragma once

/// Tells that a file has been written, replaced or removed, through its folder.
///
/// Threads: one. Ownership: owns its descriptor. Errors: throws `std::system_error` when the kernel has no watches left; a
/// folder that is not there is not watched.

#include <filesystem>
#include <string>

namespace palisade {

class FileWatch {
 public:
  explicit FileWatch(const std::filesystem::path& file);
  FileWatch(const FileWatch&) = delete;
  FileWatch& operator=(const FileWatch&) = delete;
  ~FileWatch();

  /// Becomes readable when there is something to ask about.
  int descriptor() const { return _descriptor; }

  /// Whether the file has changed since the last time. Does not wait.
  bool hasChanged();

 private:
  std::string _name;
  int _descriptor;
};

}  // namespace palisade
