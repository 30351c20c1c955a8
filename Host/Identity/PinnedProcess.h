#pragma once

/// A process, pinned, and what the kernel and the service manager say about it.
///
/// A number alone may name another process a moment later. The process is pinned first, everything is read, and then it is
/// asked whether the pinned process is still alive: if so, all that was read was about that one. Threads: every operation may
/// be called from any thread. Ownership: holds two file descriptors, shares one that it was given. Errors: `IdentityError` for
/// whatever cannot be read; none means that the kernel says there is nothing.

#include <sys/types.h>

#include <cstdint>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>

#include "Host/Files/FileDescriptor.h"

namespace palisade {

/// The file that a process runs.
struct Program {
  /// As the process's own part of the file system calls it.
  std::filesystem::path path;
  FileIdentity file;
};

class PinnedProcess {
 public:
  explicit PinnedProcess(pid_t process);
  /// Somebody else has pinned it.
  explicit PinnedProcess(std::shared_ptr<const FileDescriptor> pin);

  /// Throws when the process has ended since it was pinned.
  void requireAlive() const;

  /// The text of `/.flatpak-info` in the process's own root; none when there is no such file.
  std::optional<std::string> flatpakInfo() const;

  /// The label of the security module; none when there is no such module.
  std::optional<std::string> securityLabel() const;

  std::string cgroups() const;

  /// The unit of the user's service manager; none when the process runs outside all of them, and where no cgroup file system is
  /// mounted.
  std::optional<std::string> userUnit() const;

  Program program() const;

  /// The user whose rights it has now.
  uid_t user() const;

  /// When it started, in clock ticks since the machine came up.
  std::uint64_t startTick() const;

  /// Its folder in /proc, for whoever reads more there.
  const FileDescriptor& folder() const { return _folder; }

 private:
  PinnedProcess(pid_t process, std::shared_ptr<const FileDescriptor> pin);

  [[noreturn]] void fail(const std::string& what) const;
  std::string readText(const FileDescriptor& file, std::size_t limit, const std::string& what) const;
  std::string readSmall(const char* name, const std::string& what) const;

  const pid_t _process;
  const std::shared_ptr<const FileDescriptor> _pin;
  const FileDescriptor _folder;
};

}  // namespace palisade
