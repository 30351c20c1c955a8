#include "Host/Files/FileDescriptor.h"

#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <cerrno>

namespace palisade {

FileDescriptor::~FileDescriptor() {
  if (!isOpen()) return;
  // An error path closes files too, and errno still has to say what went wrong.
  const int error = errno;
  close(_number);
  errno = error;
}

std::optional<std::string> readAtMost(const FileDescriptor& file, std::size_t limit) {
  std::string content;
  std::array<char, 4096> buffer{};
  while (true) {
    const ssize_t count = read(file.number(), buffer.data(), buffer.size());
    if (count == 0) return content;
    if (count < 0 && errno == EINTR) continue;
    if (count < 0) return std::nullopt;
    content.append(buffer.data(), static_cast<std::size_t>(count));
    if (content.size() > limit) {
      errno = EFBIG;
      return std::nullopt;
    }
  }
}

std::optional<FileIdentity> fileIdentity(const std::filesystem::path& path) {
  struct stat status {};
  if (stat(path.c_str(), &status) != 0) return std::nullopt;
  return FileIdentity{.device = status.st_dev, .inode = status.st_ino};
}

}  // namespace palisade
