// Ends the process at a chosen call that reaches out of it: preloaded into the daemon, it counts the calls with which a process
// changes what others see (files, pipes, sockets), on all threads together, and kills the process before the call whose number
// was asked for. A test asks through a file that both have mapped: what happens between two such calls nobody can tell apart,
// so the numbers from one to the last call of an operation are all the points at which the operation can be cut.

#include <dlfcn.h>
#include <fcntl.h>
#include <signal.h>
#include <sys/mman.h>
#include <sys/socket.h>
#include <sys/types.h>
#include <sys/uio.h>
#include <unistd.h>

#include <atomic>
#include <cstdarg>
#include <cstdint>
#include <cstdlib>
#include <cstring>

namespace {

// As `Control` in kill_points.py.
struct Control {
  std::atomic<std::uint64_t> calls;
  std::atomic<std::uint64_t> fatalCall;
  char fatalName[48];
};

Control* mapControl() {
  const char* path = std::getenv("KILL_POINT_FILE");
  const int file = path == nullptr ? -1 : open(path, O_RDWR | O_CLOEXEC);
  if (file < 0) return nullptr;
  void* const mapped = mmap(nullptr, sizeof(Control), PROT_READ | PROT_WRITE, MAP_SHARED, file, 0);
  return mapped == MAP_FAILED ? nullptr : static_cast<Control*>(mapped);
}

Control* control = nullptr;

__attribute__((constructor)) void begin() { control = mapControl(); }

void beforeCall(const char* name) {
  if (control == nullptr) return;
  if (control->calls.fetch_add(1) + 1 != control->fatalCall) return;
  std::strncpy(control->fatalName, name, sizeof control->fatalName - 1);
  kill(getpid(), SIGKILL);
}

template <typename Function>
Function* next(Function*, const char* name) {
  return reinterpret_cast<Function*>(dlsym(RTLD_NEXT, name));
}

}  // namespace

// NOLINTBEGIN: the names and types are the C library's.
#define COUNTED(Result, name, parameters, ...)                               \
  extern "C" __attribute__((visibility("default"))) Result name parameters { \
    static const auto original = next(&::name, #name);                       \
    beforeCall(#name);                                                       \
    return original(__VA_ARGS__);                                            \
  }

COUNTED(ssize_t, write, (int file, const void* data, size_t size), file, data, size)
COUNTED(ssize_t, writev, (int file, const iovec* data, int count), file, data, count)
COUNTED(ssize_t, pwrite, (int file, const void* data, size_t size, off_t at), file, data, size, at)
COUNTED(ssize_t, pwrite64, (int file, const void* data, size_t size, off64_t at), file, data, size, at)
COUNTED(int, fsync, (int file), file)
COUNTED(int, fdatasync, (int file), file)
COUNTED(int, ftruncate, (int file, off_t size), file, size)
COUNTED(int, ftruncate64, (int file, off64_t size), file, size)
COUNTED(int, rename, (const char* from, const char* to), from, to)
COUNTED(int, unlink, (const char* path), path)
COUNTED(ssize_t, send, (int file, const void* data, size_t size, int flags), file, data, size, flags)
COUNTED(ssize_t, sendmsg, (int file, const msghdr* message, int flags), file, message, flags)

// Of these calls only those that take or give back a lock are seen by others.
#define COUNTED_LOCKING(name)                                                              \
  extern "C" __attribute__((visibility("default"))) int name(int file, int command, ...) { \
    static const auto original = next(&::name, #name);                                     \
    va_list arguments;                                                                     \
    va_start(arguments, command);                                                          \
    void* const argument = va_arg(arguments, void*);                                       \
    va_end(arguments);                                                                     \
    if (command == F_SETLK || command == F_SETLKW) beforeCall(#name);                      \
    return original(file, command, argument);                                              \
  }

COUNTED_LOCKING(fcntl)
COUNTED_LOCKING(fcntl64)
// NOLINTEND
