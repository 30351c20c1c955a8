#pragma once

/// Makes one daemon the only one that works on a user's stores.
///
/// A user may have several session buses, each with a daemon of its own; the stores are for one at a time, which keeps what it
/// has read and repairs what a crash has left. Threads: one. Ownership: holds the lock, flock(2), until it goes away; the
/// kernel frees the lock of a process that is killed. Errors: `std::runtime_error` with what to do.

#include <chrono>
#include <filesystem>

#include "Host/Identity/FileDescriptor.h"

namespace palisade {

class StateLock {
 public:
  /// Waits for a daemon that is about to end, as long as `patience` goes. The folder is made when there is none.
  explicit StateLock(const std::filesystem::path& stateFolder, std::chrono::milliseconds patience = std::chrono::seconds(5));

 private:
  FileDescriptor _file;
};

}  // namespace palisade
