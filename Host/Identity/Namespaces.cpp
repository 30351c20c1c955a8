#include "Host/Identity/Namespaces.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstddef>

namespace palisade {

std::optional<Namespaces> namespacesIn(const FileDescriptor& processFolder) {
  constexpr std::array<const char*, 3> names = {"ns/user", "ns/mnt", "ns/pid"};
  Namespaces namespaces;
  for (std::size_t index = 0; index < names.size(); ++index) {
    struct stat status {};
    if (fstatat(processFolder.number(), names[index], &status, 0) == 0) {
      namespaces[index] = FileIdentity{.device = status.st_dev, .inode = status.st_ino};
    } else if (errno != ENOENT) {
      return std::nullopt;
    }
  }
  return namespaces;
}

}  // namespace palisade
