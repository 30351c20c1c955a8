#pragma once

/// A folder of the system's, and files in it that nobody but root can have put there.
///
/// What counts is that root alone can change the folder, all folders above it, and the file; that the file is reached without
/// links and without crossing into another mount; and that the mounts are the machine's own. Whoever has a user namespace can
/// mount file systems in it that say of every file that it is root's, and FUSE lets users do so outside of one.
/// Threads: any, one at a time. Ownership: holds the folder open. Errors: `trouble` says in words why something does not count,
/// as the end of a sentence.

#include <filesystem>
#include <optional>
#include <string>

#include "Host/Files/FileDescriptor.h"

namespace palisade {

class SystemFolder {
 public:
  explicit SystemFolder(const std::filesystem::path& path);

  /// What is wrong with the folder, so that no file in it counts; none when nothing is.
  const std::optional<std::string>& trouble() const { return _trouble; }

  struct File {
    /// Open for reading whether it counts or not; not open, and errno says why, when it cannot be opened at all.
    FileDescriptor file;
    std::optional<std::string> trouble;
  };
  File open(const std::string& name) const;

 private:
  FileDescriptor _folder;
  std::optional<std::string> _trouble;
};

/// Whether this process has the users and the mounts of the machine itself.
bool hasNamespacesOfTheMachine();

}  // namespace palisade
