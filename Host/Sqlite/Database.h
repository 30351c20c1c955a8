#pragma once

/// A connection to one store: an SQLite file of the user's own, with a schema that this program knows.
///
/// A store is opened with write-ahead log, `synchronous=FULL` (what was committed is on the disk), foreign keys, secure
/// deletion and a busy time-out. It comes into being whole, under its final name, and is brought up to the newest schema when
/// it is opened. The file is for its owner alone (0600); a folder that is made for it too (0700).
///
/// Threads: a connection is used by one thread at a time; several connections to one file, of this or other processes, work
/// side by side. Ownership: statements and transactions live no longer than their connection. Errors: `SqliteError`. A store
/// that is damaged is set aside as `NAME.corrupt-YYYYMMDDTHHMMSS` and the opening fails; so does every later one, until a copy
/// is put back or the caller asks for a fresh store. Nothing is ever recreated in silence.

#include <chrono>
#include <cstdint>
#include <filesystem>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>

#include "Host/Sqlite/SqliteError.h"

struct sqlite3;

namespace palisade {

class Statement;

enum class DamagedStore {
  refuse,     ///< opening a damaged store, or one that was set aside before, fails
  startFresh  ///< an empty store takes its place; the damaged one stays beside it
};

struct StoreOptions {
  std::filesystem::path path;

  /// Tells this kind of store from other databases; written into the file.
  std::int32_t applicationID = 0;

  /// Element n is the SQL that takes a store from version n to version n + 1. Borrowed while the store is opened.
  std::span<const std::string_view> migrations;

  DamagedStore onDamage = DamagedStore::refuse;
  std::chrono::milliseconds busyTimeout = std::chrono::seconds{5};
};

class Database {
 public:
  /// Opens the store for reading and writing; makes it when there has never been one.
  static std::unique_ptr<Database> open(const StoreOptions& options);

  ~Database();

  /// Another connection to the same file, for reading only.
  std::unique_ptr<Database> openReader() const;

  const std::filesystem::path& path() const { return _path; }

  /// Where the damaged store went in whose place this one was made, if any.
  const std::optional<std::filesystem::path>& setAside() const { return _setAside; }

  /// Reads the whole file and throws when it is damaged. Opening does so for stores of an ordinary size.
  void check();

  /// Runs SQL that has no arguments and no rows. `during` completes "cannot ...".
  void execute(std::string_view during, const char* sql);

  /// For this folder: the two ends of a transaction, the library's connection, and its last error as an exception.
  const Statement& beginning();
  const Statement& ending();
  sqlite3* connection() const { return _connection.get(); }
  SqliteError failure(int resultCode, std::string_view during) const;

 private:
  struct Closer {
    void operator()(sqlite3* connection) const;
  };

  Database(std::filesystem::path path, int flags, std::chrono::milliseconds busyTimeout);

  static std::unique_ptr<Database> openExisting(const StoreOptions& options);
  static void createStore(const StoreOptions& options);

  std::int64_t size();
  std::int64_t pragma(const char* sql);
  void requireKnownStore(const StoreOptions& options);
  void keepLog();
  void migrate(const StoreOptions& options);

  std::filesystem::path _path;
  std::chrono::milliseconds _busyTimeout;
  std::optional<std::filesystem::path> _setAside;
  std::unique_ptr<sqlite3, Closer> _connection;
  std::unique_ptr<const Statement> _beginning;
  std::unique_ptr<const Statement> _ending;
};

}  // namespace palisade
