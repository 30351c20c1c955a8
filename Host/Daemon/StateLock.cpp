#include "Host/Daemon/StateLock.h"

#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>

#include <cerrno>
#include <cstring>
#include <thread>

namespace palisade {
namespace {

constexpr std::chrono::milliseconds pause{20};

FileDescriptor openFile(const std::filesystem::path& path) {
  FileDescriptor file(open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, S_IRUSR | S_IWUSR));
  if (!file.isOpen()) throw std::runtime_error(path.string() + " cannot be opened: " + std::strerror(errno) + ".");
  return file;
}

void makeFolder(const std::filesystem::path& folder) {
  if (std::filesystem::exists(folder)) return;
  std::filesystem::create_directories(folder.parent_path());
  if (mkdir(folder.c_str(), S_IRWXU) != 0 && errno != EEXIST) {
    throw std::runtime_error(folder.string() + " cannot be made: " + std::strerror(errno) + ".");
  }
}

}  // namespace

StateLock::StateLock(const std::filesystem::path& stateFolder, const std::string& daemon, std::chrono::milliseconds patience)
    : _file((makeFolder(stateFolder), openFile(stateFolder / (daemon + ".lock")))) {
  const auto end = std::chrono::steady_clock::now() + patience;
  while (flock(_file.number(), LOCK_EX | LOCK_NB) != 0) {
    if (errno != EWOULDBLOCK && errno != EINTR) {
      throw std::runtime_error(stateFolder.string() + " cannot be locked: " + std::strerror(errno) + ".");
    }
    if (std::chrono::steady_clock::now() > end) {
      throw StateIsTaken("Another " + daemon + " of this user, of another session perhaps, works on " + stateFolder.string() +
                         ". End that one, or start this one with another XDG_STATE_HOME.");
    }
    std::this_thread::sleep_for(pause);
  }
}

}  // namespace palisade
