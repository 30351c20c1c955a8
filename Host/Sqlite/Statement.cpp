#include "Host/Sqlite/Statement.h"

#include <sqlite3.h>

#include "Host/Sqlite/Database.h"
#include "Host/Sqlite/SqliteError.h"

namespace palisade {

void Statement::Finalizer::operator()(sqlite3_stmt* statement) const { sqlite3_finalize(statement); }

Statement::Statement(Database& database, std::string_view purpose, std::string_view sql)
    : _database(database),
      _purpose(purpose) {
  sqlite3_stmt* statement = nullptr;
  const int resultCode = sqlite3_prepare_v3(database.connection(), sql.data(), static_cast<int>(sql.size()),
                                            SQLITE_PREPARE_PERSISTENT, &statement, nullptr);
  _statement.reset(statement);
  check(resultCode);
}

void Statement::bind(int position, double value) const { check(sqlite3_bind_double(_statement.get(), position, value)); }

// The library copies what it is given, so an argument need not outlive the call that binds it. An empty view may have no
// address, which the library would take for NULL.
void Statement::bind(int position, std::string_view text) const {
  check(sqlite3_bind_text64(_statement.get(), position, text.empty() ? "" : text.data(), text.size(), SQLITE_TRANSIENT,
                            SQLITE_UTF8));
}

void Statement::bind(int position, BlobView blob) const {
  check(sqlite3_bind_blob64(_statement.get(), position, blob.bytes.empty() ? "" : blob.bytes.data(), blob.bytes.size(),
                            SQLITE_TRANSIENT));
}

void Statement::bindInteger(int position, std::int64_t value) const {
  check(sqlite3_bind_int64(_statement.get(), position, value));
}

void Statement::bindNull(int position) const { check(sqlite3_bind_null(_statement.get(), position)); }

std::int64_t Statement::changes() const { return sqlite3_changes64(_database.connection()); }

void Statement::check(int resultCode) const {
  if (resultCode != SQLITE_OK) throw _database.failure(resultCode, _purpose);
}

Statement::Run::~Run() { sqlite3_reset(_statement._statement.get()); }

bool Statement::Run::next() {
  const int resultCode = sqlite3_step(_statement._statement.get());
  if (resultCode == SQLITE_ROW) return true;
  if (resultCode == SQLITE_DONE) return false;
  throw _statement._database.failure(resultCode, _statement._purpose);
}

void Statement::Run::expectType(int column, int type) const {
  if (sqlite3_column_type(_statement._statement.get(), column) == type) return;
  throw SqliteError(StoreErrorDamaged, _statement._database.path(), _statement._purpose,
                    "column " + std::to_string(column) + " holds a value of another type; the store is damaged");
}

bool Statement::Run::isNull(int column) const {
  return sqlite3_column_type(_statement._statement.get(), column) == SQLITE_NULL;
}

std::int64_t Statement::Run::integer(int column) const {
  expectType(column, SQLITE_INTEGER);
  return sqlite3_column_int64(_statement._statement.get(), column);
}

double Statement::Run::real(int column) const {
  expectType(column, SQLITE_FLOAT);
  return sqlite3_column_double(_statement._statement.get(), column);
}

std::string Statement::Run::text(int column) const {
  expectType(column, SQLITE_TEXT);
  sqlite3_stmt* const statement = _statement._statement.get();
  const void* const bytes = sqlite3_column_text(statement, column);
  return {static_cast<const char*>(bytes), static_cast<std::size_t>(sqlite3_column_bytes(statement, column))};
}

std::optional<std::string> Statement::Run::optionalText(int column) const {
  if (isNull(column)) return std::nullopt;
  return text(column);
}

std::string Statement::Run::blob(int column) const {
  expectType(column, SQLITE_BLOB);
  sqlite3_stmt* const statement = _statement._statement.get();
  const auto* const bytes = static_cast<const char*>(sqlite3_column_blob(statement, column));
  if (bytes == nullptr) return {};
  return {bytes, static_cast<std::size_t>(sqlite3_column_bytes(statement, column))};
}

}  // namespace palisade
