#include "Host/Daemon/ModuleFile.h"

#include <fcntl.h>
#include <link.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstdint>
#include <cstring>
#include <string>
#include <system_error>
#include <vector>

#include "Host/Daemon/PluginLoader.h"
#include "Host/Files/Exposure.h"

/// The linker's name for the start of the program that this code is linked into, which is its ELF header: what a module has to
/// agree with.
extern "C" __attribute__((visibility("hidden"))) const ElfW(Ehdr) __ehdr_start;

namespace palisade {
namespace {

std::string textForErrno(int number) { return std::generic_category().message(number); }

// Refuses unless only root and this process's user can write. That a folder is sticky does not excuse it: others could put
// modules of their own beside this one.
void checkRights(const std::filesystem::path& file, const std::filesystem::path& path, const struct stat& status) {
  const std::string subject = path == file ? "it" : "its folder '" + path.string() + "'";
  if (status.st_uid != 0 && status.st_uid != geteuid()) {
    refuseModule(file, subject + " belongs to another user (user ID " + std::to_string(status.st_uid) + ")",
                 "give it to root with chown after making sure that the module is the one that was installed");
  }
  if ((status.st_mode & (S_IWGRP | S_IWOTH)) != 0) {
    refuseModule(file, subject + " is writable by other users",
                 "take that right away with chmod go-w after making sure that the module is the one that was installed");
  }
}

// An open module file and its size. Reading is bounded by that size.
class ModuleFile {
 public:
  explicit ModuleFile(const std::filesystem::path& path) : _path(path) {
    // Without O_NONBLOCK, opening a pipe that has no writer would wait for one.
    _descriptor = open(path.c_str(), O_RDONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC);
    if (_descriptor < 0) {
      refuseModule(path, "it cannot be opened (" + textForErrno(errno) + ")", "let the daemon's user read it");
    }
  }
  ~ModuleFile() { close(_descriptor); }
  ModuleFile(const ModuleFile&) = delete;
  ModuleFile& operator=(const ModuleFile&) = delete;

  void checkKindAndRights() {
    struct stat status = {};
    if (fstat(_descriptor, &status) != 0) cannotBeRead(errno);
    if (!S_ISREG(status.st_mode)) refuseModule(_path, "it is not a regular file", "name the module's .so file itself");
    checkRights(_path, _path, status);
    _size = static_cast<std::uint64_t>(status.st_size);
  }

  // Refuses a file that ends before the described bytes do.
  void checkHolds(std::uint64_t offset, std::uint64_t length) const {
    if (offset <= _size && length <= _size - offset) return;
    refuseModule(_path,
                 "it is cut off or damaged: its " + std::to_string(_size) + " bytes do not hold all that its headers describe",
                 "install it again");
  }

  void read(std::uint64_t offset, void* target, std::size_t length) const {
    checkHolds(offset, length);
    auto* bytes = static_cast<char*>(target);
    while (length > 0) {
      const ssize_t count = pread(_descriptor, bytes, length, static_cast<off_t>(offset));
      if (count < 0 && errno == EINTR) continue;
      if (count <= 0) cannotBeRead(count < 0 ? errno : EIO);
      bytes += count;
      offset += static_cast<std::uint64_t>(count);
      length -= static_cast<std::size_t>(count);
    }
  }

  std::uint64_t size() const { return _size; }

 private:
  [[noreturn]] void cannotBeRead(int number) const {
    refuseModule(_path, "it cannot be read (" + textForErrno(number) + ")", "install it again");
  }

  const std::filesystem::path& _path;
  int _descriptor = -1;
  std::uint64_t _size = 0;
};

ElfW(Ehdr) readHeader(const std::filesystem::path& path, const ModuleFile& file) {
  // An empty or very short file is told apart from one that was cut off later by what it lacks: the four magic bytes.
  ElfW(Ehdr) header = {};
  file.read(0, header.e_ident, std::min<std::uint64_t>(file.size(), EI_NIDENT));
  if (std::memcmp(header.e_ident, ELFMAG, SELFMAG) != 0) {
    refuseModule(path, "it is not a shared object", "name the module's .so file or install the plug-in again");
  }
  file.checkHolds(0, EI_NIDENT);
  const bool sameShape =
      header.e_ident[EI_CLASS] == __ehdr_start.e_ident[EI_CLASS] && header.e_ident[EI_DATA] == __ehdr_start.e_ident[EI_DATA];
  if (sameShape) file.read(0, &header, sizeof header);
  if (!sameShape || header.e_machine != __ehdr_start.e_machine) {
    refuseModule(path, "it was built for another kind of machine", "install the plug-in that was built for this one");
  }
  if (header.e_type != ET_DYN) {
    refuseModule(path, "it is an ELF file but not a shared object",
                 "name the module's .so file or build the plug-in as a module");
  }
  return header;
}

void checkSegments(const std::filesystem::path& path, const ModuleFile& file, const ElfW(Ehdr) & header) {
  if (header.e_phnum == 0 || header.e_phentsize != sizeof(ElfW(Phdr))) {
    refuseModule(path, "its program headers are damaged", "install it again");
  }
  std::vector<ElfW(Phdr)> segments(header.e_phnum);
  file.read(header.e_phoff, segments.data(), segments.size() * sizeof(ElfW(Phdr)));
  for (const ElfW(Phdr) & segment : segments) file.checkHolds(segment.p_offset, segment.p_filesz);
}

// A module without a section table is complete as well: nothing in it is needed for loading.
void checkSectionTable(const ModuleFile& file, const ElfW(Ehdr) & header) {
  if (header.e_shoff == 0) return;
  // Where the number does not fit the header, there is at least the section that tells it.
  const std::uint64_t count = std::max<std::uint64_t>(header.e_shnum, 1);
  file.checkHolds(header.e_shoff, count * header.e_shentsize);
}

}  // namespace

void refuseModule(const std::filesystem::path& file, const std::string& problem, const std::string& advice) {
  throw PluginLoadError("The plug-in module '" + file.string() + "' was not loaded: " + problem + "; " + advice + ".");
}

void checkModuleFile(const std::filesystem::path& file) {
  ModuleFile module(file);
  module.checkKindAndRights();

  const std::filesystem::path folder = file.parent_path();
  struct stat status = {};
  if (stat(folder.c_str(), &status) != 0) {
    refuseModule(file, "its folder cannot be examined (" + textForErrno(errno) + ")", "let the daemon's user enter the folder");
  }
  checkRights(file, folder, status);
  // Whoever can rename a folder further up can put another one with a module of the same name in its place.
  if (const auto exposure = exposureAbove(folder)) {
    refuseModule(file, "the folder '" + exposure->path.string() + "' above it " + exposure->problem,
                 "run " + exposure->remedy + " after making sure that the module is the one that was installed");
  }

  const ElfW(Ehdr) header = readHeader(file, module);
  checkSegments(file, module, header);
  checkSectionTable(module, header);
}

}  // namespace palisade
