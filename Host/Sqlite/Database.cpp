#include "Host/Sqlite/Database.h"

// Opening a store. What is decided here: whose file it may be, whether it is ours to read, whether it is whole, and which
// migrations it lacks. A store is built in a file beside its final name and published when it is finished, so that a store
// under its own name that is empty, or of version 0, is damage and not a beginning.

#include <sqlite3.h>

#include <system_error>

#include "Host/Sqlite/DatabaseFile.h"
#include "Host/Sqlite/Statement.h"
#include "Host/Sqlite/Transaction.h"

namespace palisade {
namespace {

constexpr std::string_view opening = "open the store";

// A store of an ordinary size is read through whenever it is opened, at about 1 ms a megabyte. Of a larger one the damage is
// found where it is read; opening it must not take seconds.
constexpr std::int64_t greatestSizeToCheck = 8 << 20;

}  // namespace

void Database::Closer::operator()(sqlite3* connection) const { sqlite3_close_v2(connection); }

std::unique_ptr<Database> Database::open(const StoreOptions& options) {
  prepareFolderOf(options.path);

  std::optional<std::filesystem::path> aside;
  if (!hasStore(options.path)) {
    // A log whose store is gone holds changes of somebody's that nobody can read any more.
    aside = hasLog(options.path) ? palisade::setAside(options.path) : latestSetAside(options.path);
    if (aside && options.onDamage == DamagedStore::refuse) {
      throw SqliteError(StoreErrorSetAside, options.path, opening,
                        "it was damaged and has been set aside as " + aside->filename().string() +
                            "; put a good copy in its place, or ask for a fresh store");
    }
    createStore(options);
  }

  std::unique_ptr<Database> database;
  try {
    database = openExisting(options);
  } catch (const SqliteError& error) {
    if (error.code() != StoreErrorDamaged) throw;
    aside = palisade::setAside(options.path);
    if (options.onDamage == DamagedStore::refuse) {
      throw SqliteError(StoreErrorDamaged, options.path, opening,
                        "it is damaged and has been set aside as " + aside->filename().string() +
                            "; put a good copy in its place, or ask for a fresh store [" + error.what() + "]");
    }
    createStore(options);
    database = openExisting(options);
  }
  database->_setAside = std::move(aside);
  return database;
}

void Database::createStore(const StoreOptions& options) {
  UnfinishedStore unfinished(options.path);
  {
    Database database(unfinished.path(), SQLITE_OPEN_READWRITE, options.busyTimeout);
    // Nobody depends on an unfinished file: it is synced once, before it gets its name.
    database.execute("make the store", "PRAGMA synchronous=OFF");
    database.keepLog();
    database.migrate(options);
    // Closing would move the log into the file too, but keeps to itself when it fails.
    database.execute("make the store", "PRAGMA wal_checkpoint(TRUNCATE)");
  }
  unfinished.publish();
}

std::unique_ptr<Database> Database::openExisting(const StoreOptions& options) {
  requirePrivateFile(options.path);
  std::unique_ptr<Database> database(new Database(options.path, SQLITE_OPEN_READWRITE, options.busyTimeout));
  database->requireKnownStore(options);
  database->keepLog();
  database->execute(opening, "PRAGMA synchronous=FULL; PRAGMA foreign_keys=ON; PRAGMA secure_delete=ON");
  if (database->size() <= greatestSizeToCheck) database->check();
  database->migrate(options);
  return database;
}

Database::~Database() = default;

std::unique_ptr<Database> Database::openReader() const {
  return std::unique_ptr<Database>(new Database(_path, SQLITE_OPEN_READONLY, _busyTimeout));
}

Database::Database(std::filesystem::path path, int flags, std::chrono::milliseconds busyTimeout)
    : _path(std::move(path)),
      _busyTimeout(busyTimeout) {
  sqlite3* connection = nullptr;
  const int resultCode =
      sqlite3_open_v2(_path.c_str(), &connection, flags | SQLITE_OPEN_NOMUTEX | SQLITE_OPEN_EXRESCODE, nullptr);
  _connection.reset(connection);
  if (resultCode != SQLITE_OK) throw failure(resultCode, opening);

  sqlite3_busy_timeout(connection, static_cast<int>(busyTimeout.count()));
  // The file may have been made by somebody else: its schema runs no functions, and SQL cannot damage it.
  sqlite3_db_config(connection, SQLITE_DBCONFIG_DEFENSIVE, 1, nullptr);
  sqlite3_db_config(connection, SQLITE_DBCONFIG_TRUSTED_SCHEMA, 0, nullptr);
  execute(opening, "PRAGMA cell_size_check=ON; PRAGMA cache_size=-512");
}

void Database::requireKnownStore(const StoreOptions& options) {
  if (size() == 0) throw SqliteError(StoreErrorDamaged, _path, opening, "it is empty");
  const std::int64_t applicationID = pragma("PRAGMA application_id");
  const std::int64_t version = pragma("PRAGMA user_version");
  if (applicationID != options.applicationID) {
    throw SqliteError(StoreErrorForeign, _path, opening, "it is a database of another kind; move it away");
  }
  if (version < 1 || version > static_cast<std::int64_t>(options.migrations.size())) {
    throw SqliteError(version < 1 ? StoreErrorDamaged : StoreErrorNewerVersion, _path, opening,
                      "it has version " + std::to_string(version) + ", and this program knows versions 1 to " +
                          std::to_string(options.migrations.size()) + "; install the newer program again");
  }
  if (sqlite3_db_readonly(connection(), "main") == 1) throw failure(SQLITE_READONLY, opening);
}

void Database::keepLog() {
  Statement setMode(*this, "keep a write-ahead log", "PRAGMA journal_mode=WAL");
  Statement::Run mode = setMode.run();
  if (!mode.next() || mode.text(0) != "wal") {
    throw SqliteError(StoreErrorOther, _path, opening, "its file system cannot keep a write-ahead log");
  }
}

void Database::migrate(const StoreOptions& options) {
  if (pragma("PRAGMA user_version") == static_cast<std::int64_t>(options.migrations.size())) return;
  Transaction transaction(*this);
  // Read again under the write lock: another process may have done it meanwhile.
  const auto version = static_cast<std::size_t>(pragma("PRAGMA user_version"));
  for (std::size_t next = version; next < options.migrations.size(); ++next) {
    execute("bring the store up to date", std::string(options.migrations[next]).c_str());
  }
  execute("bring the store up to date", ("PRAGMA application_id=" + std::to_string(options.applicationID) +
                                         "; PRAGMA user_version=" + std::to_string(options.migrations.size()))
                                            .c_str());
  transaction.commit();
}

std::int64_t Database::size() { return pragma("PRAGMA page_count") * pragma("PRAGMA page_size"); }

void Database::check() {
  Statement quickCheck(*this, "check the store", "PRAGMA quick_check(1)");
  Statement::Run finding = quickCheck.run();
  if (!finding.next()) throw SqliteError(StoreErrorDamaged, _path, "check the store", "the check found nothing to read");
  const std::string verdict = finding.text(0);
  if (verdict != "ok") throw SqliteError(StoreErrorDamaged, _path, "check the store", verdict);
}

const Statement& Database::beginning() {
  if (_beginning == nullptr) _beginning = std::make_unique<const Statement>(*this, "begin a change", "BEGIN IMMEDIATE");
  return *_beginning;
}

const Statement& Database::ending() {
  if (_ending == nullptr) _ending = std::make_unique<const Statement>(*this, "store a change", "COMMIT");
  return *_ending;
}

void Database::execute(std::string_view during, const char* sql) {
  const int resultCode = sqlite3_exec(connection(), sql, nullptr, nullptr, nullptr);
  if (resultCode != SQLITE_OK) throw failure(resultCode, during);
}

std::int64_t Database::pragma(const char* sql) {
  Statement read(*this, opening, sql);
  Statement::Run row = read.run();
  return row.next() ? row.integer(0) : 0;
}

SqliteError Database::failure(int resultCode, std::string_view during) const {
  const bool hasOwnMessage = connection() != nullptr && sqlite3_extended_errcode(connection()) == resultCode;
  return SqliteError::fromResult(resultCode, _path, during, hasOwnMessage ? sqlite3_errmsg(connection()) : "");
}

}  // namespace palisade
