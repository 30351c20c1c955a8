#pragma once

/// Makes one daemon of its kind the only one that works on a user's stores.
///
/// A user may have several session buses, each with daemons of its own; the stores are for one at a time, which keeps what it
/// has read and repairs what a crash has left. Threads: one. Ownership: holds the lock, flock(2), until it goes away; the
/// kernel frees the lock of a process that is killed. Errors: `StateIsTaken` when another daemon holds the lock, and
/// `std::runtime_error` when there can be none; both say what to do.

#include <chrono>
#include <filesystem>
#include <stdexcept>
#include <string>

#include "Host/Files/FileDescriptor.h"

namespace palisade {

class StateIsTaken : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

class StateLock {
 public:
  /// `daemon` is the program's name. A daemon that is about to end is waited for, as long as `patience` goes. The folder is
  /// made when there is none.
  StateLock(const std::filesystem::path& stateFolder, const std::string& daemon, std::chrono::milliseconds patience);

 private:
  FileDescriptor _file;
};

}  // namespace palisade
