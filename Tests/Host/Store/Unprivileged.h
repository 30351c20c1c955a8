#pragma once

/// Makes the rights of files count in a test that root runs: until it is destroyed, files are opened as another user's, who
/// owns the folder. For every other user it changes nothing.

#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <system_error>

namespace palisade {

class Unprivileged {
 public:
  explicit Unprivileged(const std::filesystem::path& folder) {
    if (!_isRoot) return;
    if (chown(folder.c_str(), nobody, nobody) != 0 || seteuid(nobody) != 0) {
      throw std::system_error(errno, std::generic_category(), "cannot become another user");
    }
  }
  Unprivileged(const Unprivileged&) = delete;
  Unprivileged& operator=(const Unprivileged&) = delete;
  ~Unprivileged() {
    if (_isRoot && seteuid(0) != 0) std::terminate();
  }

 private:
  static constexpr uid_t nobody = 65534;

  const bool _isRoot = geteuid() == 0;
};

}  // namespace palisade
