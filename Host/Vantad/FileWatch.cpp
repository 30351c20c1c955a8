#include "Host/Vantad/FileWatch.h"

#include <sys/inotify.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstddef>
#include <cstring>
#include <system_error>

namespace palisade {

FileWatch::FileWatch(const std::filesystem::path& file)
    : _name(file.filename()),
      _descriptor(inotify_init1(IN_CLOEXEC | IN_NONBLOCK)) {
  if (_descriptor < 0) throw std::system_error(errno, std::generic_category(), "cannot watch " + file.string());
  inotify_add_watch(_descriptor, file.parent_path().c_str(), IN_CLOSE_WRITE | IN_MOVED_TO | IN_DELETE);
}

FileWatch::~FileWatch() { close(_descriptor); }

bool FileWatch::hasChanged() {
  bool changed = false;
  alignas(inotify_event) std::array<char, 4096> buffer;
  for (ssize_t size = 0; (size = read(_descriptor, buffer.data(), buffer.size())) > 0;) {
    for (const char* position = buffer.data(); position < buffer.data() + size;) {
      inotify_event event;
      std::memcpy(&event, position, sizeof event);
      const char* const name = position + sizeof event;
      if ((event.mask & IN_Q_OVERFLOW) != 0 || (event.len > 0 && _name == name)) changed = true;
      position = name + event.len;
    }
  }
  return changed;
}

}  // namespace palisade
