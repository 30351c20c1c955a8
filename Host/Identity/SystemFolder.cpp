#include "Host/Identity/SystemFolder.h"

#include <fcntl.h>
#include <linux/magic.h>
#include <linux/nsfs.h>
#include <linux/openat2.h>
#include <sys/ioctl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <sys/vfs.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <system_error>

namespace palisade {
namespace {

// The kernel gives the machine's own user namespace this number, and no other one ever.
constexpr ino_t machinesUserNamespace = 0xEFFFFFFD;

constexpr int readingFlags = O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY;

bool isMachinesUserNamespace(int descriptor) {
  struct stat status {};
  return fstat(descriptor, &status) == 0 && status.st_ino == machinesUserNamespace;
}

// The end of a sentence that begins with the file or the folder; none when root alone can change it. Others cannot take a
// file's place in a sticky folder.
std::optional<std::string> othersRights(const struct stat& status, bool isStickyEnough) {
  if (status.st_uid != 0) return "belongs to another user than root";
  const bool isSticky = isStickyEnough && (status.st_mode & S_ISVTX) != 0;
  if ((status.st_mode & (S_IWGRP | S_IWOTH)) != 0 && !isSticky) return "is writable by others than root";
  return std::nullopt;
}

std::optional<std::string> othersRightsAbove(const std::filesystem::path& folder) {
  for (std::filesystem::path above = folder.parent_path();; above = above.parent_path()) {
    struct stat status {};
    if (stat(above.c_str(), &status) != 0) return above.string() + " cannot be examined: " + std::strerror(errno);
    if (const auto rights = othersRights(status, true)) return above.string() + ", above its folder, " + *rights;
    if (above == above.root_path()) return std::nullopt;
  }
}

std::optional<std::string> troubleWith(const FileDescriptor& folder) {
  struct stat status {};
  struct statfs system {};
  if (!folder.isOpen() || fstat(folder.number(), &status) != 0 || fstatfs(folder.number(), &system) != 0) {
    return std::string("its folder cannot be examined: ") + std::strerror(errno);
  }
  if (!hasNamespacesOfTheMachine()) {
    return "the account daemon runs in a user namespace, where a user can mount what says that it is root's";
  }
  if (system.f_type == FUSE_SUPER_MAGIC) return "its folder is on a FUSE file system, which users can mount";
  if (const auto rights = othersRights(status, false)) return "its folder " + *rights;
  std::error_code error;
  // Where it is, whatever links led there; those were root's.
  const auto place = std::filesystem::read_symlink("/proc/self/fd/" + std::to_string(folder.number()), error);
  if (error) return "its folder cannot be found again: " + error.message();
  return othersRightsAbove(place);
}

// The C library has no function for it yet.
int openBelow(const FileDescriptor& folder, const std::string& name) {
  open_how how{};
  how.flags = readingFlags;
  how.resolve = RESOLVE_BENEATH | RESOLVE_NO_SYMLINKS | RESOLVE_NO_MAGICLINKS | RESOLVE_NO_XDEV;
  return static_cast<int>(syscall(SYS_openat2, folder.number(), name.c_str(), &how, sizeof(how)));
}

std::string reasonOfOpening(int error) {
  if (error == ELOOP) return "it is a link";
  if (error == EXDEV) return "it is a mount of its own";
  return std::string("the kernel does not open it without links and mounts (openat2): ") + std::strerror(error);
}

}  // namespace

bool hasNamespacesOfTheMachine() {
  const FileDescriptor users(::open("/proc/self/ns/user", O_RDONLY | O_CLOEXEC));
  // A kernel without user namespaces has only this one.
  if (!users.isOpen()) return errno == ENOENT && access("/proc/self/ns/mnt", F_OK) == 0;
  const FileDescriptor mounts(::open("/proc/self/ns/mnt", O_RDONLY | O_CLOEXEC));
  if (!mounts.isOpen()) return false;
  const FileDescriptor owner(ioctl(mounts.number(), NS_GET_USERNS));
  return isMachinesUserNamespace(users.number()) && owner.isOpen() && isMachinesUserNamespace(owner.number());
}

SystemFolder::SystemFolder(const std::filesystem::path& path)
    : _folder(::open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC)),
      _trouble(troubleWith(_folder)) {}

SystemFolder::File SystemFolder::open(const std::string& name) const {
  File opened{.file = FileDescriptor(openBelow(_folder, name)), .trouble = _trouble};
  if (!opened.file.isOpen()) {
    const int error = errno;
    if (!opened.trouble) opened.trouble = reasonOfOpening(error);
    opened.file = FileDescriptor(openat(_folder.number(), name.c_str(), readingFlags));
    return opened;
  }
  struct stat status {};
  if (fstat(opened.file.number(), &status) != 0) {
    opened.trouble = std::string("it cannot be examined: ") + std::strerror(errno);
  } else if (const auto rights = othersRights(status, false); rights && !opened.trouble) {
    opened.trouble = "it " + *rights;
  }
  return opened;
}

}  // namespace palisade
