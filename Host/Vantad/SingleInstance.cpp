#include "Host/Vantad/SingleInstance.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <system_error>

namespace palisade {

SingleInstance::SingleInstance(const std::filesystem::path& lockFile)
    : _file(open(lockFile.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, S_IRUSR | S_IWUSR)) {
  if (_file < 0) throw std::system_error(errno, std::generic_category(), "cannot open " + lockFile.string());
  if (flock(_file, LOCK_EX | LOCK_NB) == 0) return;
  const int reason = errno;
  close(_file);
  if (reason == EWOULDBLOCK) throw AlreadyRunning("Another process holds " + lockFile.string() + ".");
  throw std::system_error(reason, std::generic_category(), "cannot lock " + lockFile.string());
}

SingleInstance::~SingleInstance() { close(_file); }

}  // namespace palisade
