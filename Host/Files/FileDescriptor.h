#pragma once

/// An open file that closes itself, and the little that is read from small files.
///
/// Threads: plain functions. Ownership: a descriptor has one owner. Errors: errno, as the system calls leave it.

#include <sys/types.h>

#include <cstddef>
#include <filesystem>
#include <optional>
#include <string>
#include <utility>

namespace palisade {

class FileDescriptor {
 public:
  /// Takes over what open(2) and its kin answer, failures included.
  explicit FileDescriptor(int number) : _number(number) {}
  FileDescriptor(FileDescriptor&& other) noexcept : _number(std::exchange(other._number, -1)) {}
  FileDescriptor(const FileDescriptor&) = delete;
  FileDescriptor& operator=(const FileDescriptor&) = delete;
  FileDescriptor& operator=(FileDescriptor&& other) noexcept {
    std::swap(_number, other._number);
    return *this;
  }
  ~FileDescriptor();

  bool isOpen() const { return _number >= 0; }
  int number() const { return _number; }

 private:
  int _number;
};

/// Everything that is left in the file; none, and errno says why, when it cannot be read or holds more than `limit` bytes
/// (EFBIG).
std::optional<std::string> readAtMost(const FileDescriptor& file, std::size_t limit);

/// Which file it is, whatever its names are.
struct FileIdentity {
  dev_t device;
  ino_t inode;

  friend bool operator==(const FileIdentity&, const FileIdentity&) = default;
};

/// None when there is no such file, or none that may be looked at.
std::optional<FileIdentity> fileIdentity(const std::filesystem::path& path);

}  // namespace palisade
