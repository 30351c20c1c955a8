#include "Host/Sqlite/DatabaseFile.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <cstdio>
#include <ctime>
#include <string>
#include <system_error>

#include "Host/Sqlite/SqliteError.h"

namespace palisade {
namespace {

namespace fs = std::filesystem;

constexpr std::string_view setAsideMark = ".corrupt-";

// The library names these two itself. The log holds changes that are not in the store yet; the index is rebuilt from it.
fs::path logOf(const fs::path& store) { return store.string() + "-wal"; }
fs::path indexOf(const fs::path& store) { return store.string() + "-shm"; }

SqliteError systemFailure(const fs::path& path, std::string_view during, int errorNumber) {
  const bool isFull = errorNumber == ENOSPC || errorNumber == EDQUOT || errorNumber == EFBIG;
  return {isFull ? StoreErrorFull : StoreErrorNotWritable, path, during, std::generic_category().message(errorNumber)};
}

void removeFile(const fs::path& path) {
  std::error_code ignored;
  fs::remove(path, ignored);
}

// Makes the content of a file, or the names in a folder, survive a power cut.
void sync(const fs::path& path) {
  const int file = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
  const bool isSynced = file >= 0 && ::fsync(file) == 0;
  const int errorNumber = errno;
  if (file >= 0) ::close(file);
  if (!isSynced) throw systemFailure(path, "make sure that it is on the disk", errorNumber);
}

std::string now() {
  const std::time_t time = std::time(nullptr);
  std::tm parts{};
  ::gmtime_r(&time, &parts);
  std::array<char, sizeof "YYYYMMDDTHHMMSS"> text{};
  std::strftime(text.data(), text.size(), "%Y%m%dT%H%M%S", &parts);
  return text.data();
}

}  // namespace

void prepareFolderOf(const fs::path& store) {
  const fs::path folder = store.parent_path();
  std::error_code error;
  fs::create_directories(folder.parent_path(), error);
  if (::mkdir(folder.c_str(), 0700) != 0 && errno != EEXIST) throw systemFailure(folder, "make the folder", errno);

  struct stat status {};
  if (::stat(folder.c_str(), &status) != 0) throw systemFailure(folder, "look at the folder", errno);
  const bool isOurs = status.st_uid == ::geteuid() || status.st_uid == 0;
  if (!isOurs || (status.st_mode & (S_IWGRP | S_IWOTH)) != 0) {
    throw SqliteError(StoreErrorNotWritable, folder, "keep a store in this folder",
                      "other users can write to it; take that right away with chmod go-w");
  }
}

void requirePrivateFile(const fs::path& store) {
  struct stat status {};
  if (::lstat(store.c_str(), &status) != 0) throw systemFailure(store, "look at the store", errno);
  if (!S_ISREG(status.st_mode) || status.st_uid != ::geteuid()) {
    throw SqliteError(StoreErrorNotWritable, store, "open the store", "it is not a plain file of this user's");
  }
  if ((status.st_mode & (S_IRWXG | S_IRWXO)) != 0 && ::chmod(store.c_str(), S_IRUSR | S_IWUSR) != 0) {
    throw systemFailure(store, "make the store private", errno);
  }
}

// The process ID keeps two processes apart; a file of that name is what a killed process with the same number left.
UnfinishedStore::UnfinishedStore(fs::path store)
    : _store(std::move(store)),
      _path(_store.string() + ".new-" + std::to_string(::getpid())) {
  remove();
  const int file = ::open(_path.c_str(), O_RDWR | O_CREAT | O_EXCL | O_NOFOLLOW | O_CLOEXEC, S_IRUSR | S_IWUSR);
  if (file < 0) throw systemFailure(_store, "make the store", errno);
  ::close(file);
}

UnfinishedStore::~UnfinishedStore() { remove(); }

void UnfinishedStore::remove() const {
  for (const fs::path& file : {_path, logOf(_path), indexOf(_path)}) removeFile(file);
}

void UnfinishedStore::publish() {
  sync(_path);
  if (::link(_path.c_str(), _store.c_str()) != 0 && errno != EEXIST) throw systemFailure(_store, "make the store", errno);
  sync(_store.parent_path());
}

fs::path setAside(const fs::path& store) {
  fs::path aside = store.string() + std::string(setAsideMark) + now();
  for (int number = 2; hasStore(aside) || hasLog(aside); ++number) {
    aside = store.string() + std::string(setAsideMark) + now() + "-" + std::to_string(number);
  }
  // The store goes first: a log that is left without its store is never taken for the log of another.
  for (const auto& [from, to] : {std::pair{store, aside}, std::pair{logOf(store), logOf(aside)}}) {
    if (::rename(from.c_str(), to.c_str()) != 0 && errno != ENOENT) throw systemFailure(from, "set the store aside", errno);
  }
  removeFile(indexOf(store));
  sync(store.parent_path());
  return aside;
}

std::optional<fs::path> latestSetAside(const fs::path& store) {
  const std::string prefix = store.filename().string() + std::string(setAsideMark);
  std::optional<fs::path> latest;
  std::error_code error;
  for (fs::directory_iterator entry(store.parent_path(), error), end; !error && entry != end; entry.increment(error)) {
    if (!entry->path().filename().string().starts_with(prefix)) continue;
    if (!latest || *latest < entry->path()) latest = entry->path();
  }
  if (error) throw systemFailure(store, "look for an earlier store", error.value());
  return latest;
}

bool hasStore(const fs::path& store) {
  struct stat status {};
  if (::lstat(store.c_str(), &status) == 0) return true;
  if (errno != ENOENT) throw systemFailure(store, "look at the store", errno);
  return false;
}

bool hasLog(const fs::path& store) { return hasStore(logOf(store)); }

}  // namespace palisade
