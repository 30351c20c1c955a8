#pragma once

/// Put before a fixture where so many stores are made that syncing them, which is not what is tested, would take minutes: the
/// test's temporary folders are in memory then, where there is a place for that.

#include <cstdlib>
#include <filesystem>

namespace palisade {

class InMemory {
 protected:
  InMemory() {
    if (std::filesystem::is_directory("/dev/shm")) setenv("TMPDIR", "/dev/shm", 1);
  }
};

}  // namespace palisade
