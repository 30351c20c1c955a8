#include "Tests/Host/Store/DiskFaults.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <climits>
#include <cstring>
#include <string>
#include <string_view>
#include <vector>

namespace palisade::disk {
namespace {

// The copy is named after the file's number: a file keeps it when it is renamed.
constexpr std::string_view syncedMark = "synced-";

std::filesystem::path syncedCopyOf(const std::filesystem::path& file, const struct stat& status) {
  return file.parent_path() / (std::string(syncedMark) + std::to_string(status.st_ino));
}

bool isSyncedCopy(const std::filesystem::path& file) { return file.filename().string().starts_with(syncedMark); }

struct State {
  char folder[PATH_MAX] = "";
  std::atomic<bool> isOrdered = false;
  std::atomic<bool> wasCarriedOut = false;
  std::atomic<bool> keepsSyncedCopies = false;
  std::atomic<std::size_t> call = 0;
  std::size_t orderedCall = 0;
  Fault fault = Fault::failsOnce;
  int errorNumber = 0;
};

State state;

// The file's name when it lies in the watched folder, else the empty string.
std::string watchedName(int file) {
  char name[PATH_MAX];
  const std::string link = "/proc/self/fd/" + std::to_string(file);
  const ssize_t size = ::readlink(link.c_str(), name, sizeof name);
  if (size <= 0 || state.folder[0] == '\0') return {};
  std::string path(name, static_cast<std::size_t>(size));
  return path.starts_with(state.folder) ? path : std::string();
}

// Whether the call has to fail; errno is set then.
bool fails(int file) {
  if (!state.isOrdered || watchedName(file).empty()) return false;
  const std::size_t call = ++state.call;
  const bool isMeant = state.fault == Fault::failsFromNow ? call >= state.orderedCall : call == state.orderedCall;
  if (!isMeant) return false;
  state.wasCarriedOut = true;
  if (state.fault == Fault::kill) ::raise(SIGKILL);
  errno = state.errorNumber;
  return true;
}

void keepSyncedCopy(int file) {
  if (!state.keepsSyncedCopies) return;
  const std::string name = watchedName(file);
  struct stat status {};
  if (name.empty() || ::fstat(file, &status) != 0 || !S_ISREG(status.st_mode)) return;
  const int source = ::open(name.c_str(), O_RDONLY | O_CLOEXEC);
  const int copy = ::open(syncedCopyOf(name, status).c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0600);
  std::vector<char> buffer(1 << 16);
  for (ssize_t size = 0; (size = ::read(source, buffer.data(), buffer.size())) > 0;) {
    ::syscall(SYS_write, copy, buffer.data(), static_cast<std::size_t>(size));
  }
  ::close(source);
  ::close(copy);
}

}  // namespace

void watch(const std::filesystem::path& folder) { std::strncpy(state.folder, folder.c_str(), sizeof state.folder - 1); }

void order(Fault fault, std::size_t call, int errorNumber) {
  state.fault = fault;
  state.orderedCall = call;
  state.errorNumber = errorNumber;
  state.call = 0;
  state.wasCarriedOut = false;
  state.isOrdered = true;
}

bool withdraw() {
  state.isOrdered = false;
  return state.wasCarriedOut;
}

void keepSyncedCopies(bool isOn) { state.keepsSyncedCopies = isOn; }

void cutPower(const std::filesystem::path& folder) {
  std::vector<std::filesystem::path> files;
  for (const auto& entry : std::filesystem::directory_iterator(folder)) files.push_back(entry.path());
  for (const auto& file : files) {
    if (isSyncedCopy(file)) continue;
    struct stat status {};
    const bool wasSynced = ::stat(file.c_str(), &status) == 0 && std::filesystem::exists(syncedCopyOf(file, status));
    if (file.string().ends_with("-shm")) {
      std::filesystem::remove(file);
    } else if (wasSynced) {
      std::filesystem::rename(syncedCopyOf(file, status), file);
    } else {
      std::filesystem::resize_file(file, 0);
    }
  }
  for (const auto& file : files) {
    if (isSyncedCopy(file)) std::filesystem::remove(file);
  }
}

}  // namespace palisade::disk

// The library finds these before the C library's own. They do the system call themselves: the C library's functions are
// shadowed by these, and a sanitizer's are too.
extern "C" {

#define ANSWERED_HERE __attribute__((visibility("default")))

ANSWERED_HERE ssize_t write(int file, const void* bytes, size_t size) {
  if (palisade::disk::fails(file)) return -1;
  return ::syscall(SYS_write, file, bytes, size);
}

ANSWERED_HERE ssize_t pwrite64(int file, const void* bytes, size_t size, off64_t offset) {
  if (palisade::disk::fails(file)) return -1;
  return ::syscall(SYS_pwrite64, file, bytes, size, offset);
}

ANSWERED_HERE int ftruncate64(int file, off64_t size) noexcept {
  if (palisade::disk::fails(file)) return -1;
  return static_cast<int>(::syscall(SYS_ftruncate, file, size));
}

ANSWERED_HERE int fsync(int file) {
  if (palisade::disk::fails(file)) return -1;
  const int result = static_cast<int>(::syscall(SYS_fsync, file));
  if (result == 0) palisade::disk::keepSyncedCopy(file);
  return result;
}

ANSWERED_HERE int fdatasync(int file) {
  if (palisade::disk::fails(file)) return -1;
  const int result = static_cast<int>(::syscall(SYS_fdatasync, file));
  if (result == 0) palisade::disk::keepSyncedCopy(file);
  return result;
}

}  // extern "C"
