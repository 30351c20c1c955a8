#pragma once

/// The file that a store lives in: whose it is, how it comes into being, and where it goes when it is damaged.
///
/// Threads: any; other processes may do the same at the same time. Errors: `SqliteError`.

#include <filesystem>
#include <optional>

namespace palisade {

/// Makes the folder of a store, readable for this user only, unless it is there. Refuses one that others can write to.
void prepareFolderOf(const std::filesystem::path& store);

/// Refuses what is not a file of this user's, and takes every right from everybody else.
void requirePrivateFile(const std::filesystem::path& store);

/// A new, empty, private file beside the store, for it to be built in.
class UnfinishedStore {
 public:
  explicit UnfinishedStore(std::filesystem::path store);
  UnfinishedStore(const UnfinishedStore&) = delete;
  UnfinishedStore& operator=(const UnfinishedStore&) = delete;
  ~UnfinishedStore();

  const std::filesystem::path& path() const { return _path; }

  /// Gives the file the store's name, unless somebody else was faster: either way there is a store afterwards.
  void publish();

 private:
  void remove() const;

  std::filesystem::path _store;
  std::filesystem::path _path;
};

/// Renames the store, and the log that belongs to it, to `NAME.corrupt-YYYYMMDDTHHMMSS`; answers that name.
std::filesystem::path setAside(const std::filesystem::path& store);

/// The latest of the stores that were set aside under this name.
std::optional<std::filesystem::path> latestSetAside(const std::filesystem::path& store);

/// Whether the store, and whether its log, is there.
bool hasStore(const std::filesystem::path& store);
bool hasLog(const std::filesystem::path& store);

}  // namespace palisade
