#pragma once

/// Keeps a second process of the same kind from working on the same files.
///
/// Threads: one. Ownership: holds the lock until it is destroyed, or the process ends in whatever way. Errors: throws
/// `AlreadyRunning` when another process holds the lock, `std::system_error` when the file cannot be had.

#include <filesystem>
#include <stdexcept>

namespace palisade {

class AlreadyRunning : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

class SingleInstance {
 public:
  explicit SingleInstance(const std::filesystem::path& lockFile);
  SingleInstance(const SingleInstance&) = delete;
  SingleInstance& operator=(const SingleInstance&) = delete;
  ~SingleInstance();

 private:
  int _file;
};

}  // namespace palisade
