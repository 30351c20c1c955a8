#include "Host/Identity/ClientRecordFiles.h"

#include <fcntl.h>
#include <sys/stat.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <optional>
#include <set>
#include <system_error>

#include "Host/Files/FileDescriptor.h"
#include "Host/Identity/SystemFolder.h"
#include "Host/Preferences/TomlFile.h"

// Whoever can write a record that counts can give away entitlements. So the folder and the file are opened first, who owns them
// is asked of what is open, and what is open is read: a name that is made to point elsewhere meanwhile changes nothing.

namespace palisade {
namespace {

constexpr off_t largestRecord = 64 * 1024;

std::filesystem::path pathOf(const FileDescriptor& file) { return "/proc/self/fd/" + std::to_string(file.number()); }

[[noreturn]] void failToRead() { throw ClientRecordError(std::string("it cannot be read: ") + std::strerror(errno) + "."); }

// Opens records in one folder: the system's as such, any other as it is.
class RecordFolder {
 public:
  RecordFolder(const std::filesystem::path& path, bool isSystems)
      : _folder(open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC)) {
    if (isSystems && _folder.isOpen()) _system.emplace(path);
  }

  const FileDescriptor& descriptor() const { return _folder; }

  // With what keeps its entitlements from counting.
  SystemFolder::File openRecord(const std::string& name) const {
    SystemFolder::File opened = _system ? _system->open(name) : openAsItIs(name);
    struct stat status {};
    if (!opened.file.isOpen() || fstat(opened.file.number(), &status) != 0) failToRead();
    if (!S_ISREG(status.st_mode)) throw ClientRecordError("it is no regular file.");
    if (status.st_size > largestRecord) throw ClientRecordError("it is larger than 64 KiB.");
    return opened;
  }

 private:
  SystemFolder::File openAsItIs(const std::string& name) const {
    return {.file = FileDescriptor(openat(_folder.number(), name.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY)),
            .trouble = "its folder is none of the system's"};
  }

  FileDescriptor _folder;
  std::optional<SystemFolder> _system;
};

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
  void readFolder(const std::filesystem::path& path, bool isSystems) {
    const RecordFolder folder(path, isSystems);
    if (!folder.descriptor().isOpen()) {
      if (errno != ENOENT) tell(path, std::string("it cannot be read: ") + std::strerror(errno) + ".");
      return;
    }
    std::set<std::string> decidedHere;
    for (const std::string& name : namesIn(folder.descriptor(), path)) {
      try {
        readRecord(folder, path / name, decidedHere);
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

  void readRecord(const RecordFolder& folder, const std::filesystem::path& path, std::set<std::string>& decidedHere) {
    const SystemFolder::File opened = folder.openRecord(path.filename());
    ClientRecord record = clientRecordFromTable(tableIn(opened.file));
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
    if (!record.entitlements.empty() && opened.trouble) {
      record.entitlements.clear();
      tell(path, "its entitlements do not count: " + *opened.trouble +
                     ". They count in files that root alone can change, below the system's folders. The rest of the record "
                     "counts.");
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

ClientRecords readClientRecords(const std::vector<std::filesystem::path>& folders,
                                const std::vector<std::filesystem::path>& systemFolders) {
  Reader reader;
  for (const std::filesystem::path& folder : folders) {
    reader.readFolder(folder, std::ranges::find(systemFolders, folder) != systemFolders.end());
  }
  return reader.take();
}

}  // namespace palisade
