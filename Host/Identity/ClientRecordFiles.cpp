#include "Host/Identity/ClientRecordFiles.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <set>
#include <system_error>

#include "Host/Files/FileDescriptor.h"
#include "Host/Preferences/TomlFile.h"

// Whoever can write a record that counts can give away entitlements. So the folder and the file are opened first, who owns them
// is asked of what is open, and what is open is read: a name that is made to point elsewhere meanwhile changes nothing.

namespace palisade {
namespace {

constexpr off_t largestRecord = 64 * 1024;

bool isRootsAlone(const struct stat& status) { return status.st_uid == 0 && (status.st_mode & (S_IWGRP | S_IWOTH)) == 0; }

std::filesystem::path pathOf(const FileDescriptor& file) { return "/proc/self/fd/" + std::to_string(file.number()); }

[[noreturn]] void failToRead() { throw ClientRecordError(std::string("it cannot be read: ") + std::strerror(errno) + "."); }

struct OpenRecord {
  FileDescriptor file;
  bool isTrusted;
};

OpenRecord openRecord(const FileDescriptor& folder, const std::string& name) {
  constexpr int flags = O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY;
  FileDescriptor file(openat(folder.number(), name.c_str(), flags | O_NOFOLLOW));
  // A link may lead into a folder of somebody else.
  const bool isLink = !file.isOpen() && errno == ELOOP;
  if (isLink) file = FileDescriptor(openat(folder.number(), name.c_str(), flags));
  struct stat status {};
  if (!file.isOpen() || fstat(file.number(), &status) != 0) failToRead();
  if (!S_ISREG(status.st_mode)) throw ClientRecordError("it is no regular file.");
  if (status.st_size > largestRecord) throw ClientRecordError("it is larger than 64 KiB.");
  return {.file = std::move(file), .isTrusted = !isLink && isRootsAlone(status)};
}

Dictionary tableIn(const FileDescriptor& file) {
  const std::string path = pathOf(file);
  try {
    return readTomlFile(path).value_or(Dictionary());
  } catch (const TomlError& error) {
    // The message begins with the path that was read, which says nothing to anybody.
    std::string reason = error.what();
    const std::string beginning = path + ", ";
    if (reason.starts_with(beginning)) reason.erase(0, beginning.size());
    throw ClientRecordError(reason);
  }
}

class Reader {
 public:
  void readFolder(const std::filesystem::path& path) {
    const FileDescriptor folder(open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
    if (!folder.isOpen()) {
      if (errno != ENOENT) tell(path, std::string("it cannot be read: ") + std::strerror(errno) + ".");
      return;
    }
    struct stat status {};
    const bool isTrusted = fstat(folder.number(), &status) == 0 && isRootsAlone(status);
    std::set<std::string> decidedHere;
    for (const std::string& name : namesIn(folder, path)) {
      try {
        readRecord(folder, isTrusted, path / name, decidedHere);
      } catch (const ClientRecordError& error) {
        tell(path / name, std::string(error.what()) + " The record is left out.");
      }
    }
    _decided.merge(decidedHere);
  }

  ClientRecords take() { return std::move(_result); }

 private:
  std::vector<std::string> namesIn(const FileDescriptor& folder, const std::filesystem::path& path) {
    std::vector<std::string> names;
    std::error_code error;
    for (std::filesystem::directory_iterator entry(pathOf(folder), error), end; !error && entry != end;
         entry.increment(error)) {
      const std::string name = entry->path().filename();
      if (name.ends_with(".toml") && !name.starts_with('.')) names.push_back(name);
    }
    if (error) tell(path, "it cannot be listed: " + error.message() + ".");
    std::ranges::sort(names);
    return names;
  }

  void readRecord(const FileDescriptor& folder, bool isFolderTrusted, const std::filesystem::path& path,
                  std::set<std::string>& decidedHere) {
    const OpenRecord open = openRecord(folder, path.filename());
    ClientRecord record = clientRecordFromTable(tableIn(open.file));
    record.file = path;
    // A folder that comes later does not speak about what an earlier one has described.
    if (_decided.contains(record.bundleID)) return;
    for (const ClientRecord& earlier : _result.records) {
      if (earlier.bundleID == record.bundleID) {
        throw ClientRecordError(earlier.file.string() + " describes '" + record.bundleID + "' already.");
      }
      if (const auto shared = sharedMatch(earlier.match, record.match)) {
        throw ClientRecordError(earlier.file.string() + " recognises " + *shared + " already.");
      }
    }
    if (!record.entitlements.empty() && !(isFolderTrusted && open.isTrusted)) {
      record.entitlements.clear();
      tell(path,
           "its entitlements do not count, because the file and its folder must belong to root, be writable by nobody "
           "else, and be no links. The rest of the record counts.");
    }
    decidedHere.insert(record.bundleID);
    _result.records.push_back(std::move(record));
  }

  void tell(const std::filesystem::path& path, const std::string& reason) {
    _result.troubles.push_back(path.string() + ": " + reason);
  }

  ClientRecords _result;
  std::set<std::string> _decided;
};

}  // namespace

ClientRecords readClientRecords(const std::vector<std::filesystem::path>& folders) {
  Reader reader;
  for (const std::filesystem::path& folder : folders) reader.readFolder(folder);
  return reader.take();
}

}  // namespace palisade
