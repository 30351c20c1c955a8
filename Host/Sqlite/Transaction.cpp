#include "Host/Sqlite/Transaction.h"

#include <sqlite3.h>

#include "Host/Sqlite/Database.h"
#include "Host/Sqlite/Statement.h"

namespace palisade {

Transaction::Transaction(Database& database) : _database(database) { _database.beginning().execute(); }

// The library has rolled back by itself after some errors; a second time does no harm, and there is nobody to tell.
Transaction::~Transaction() {
  if (_isOpen) sqlite3_exec(_database.connection(), "ROLLBACK", nullptr, nullptr, nullptr);
}

void Transaction::commit() {
  _database.ending().execute();
  _isOpen = false;
}

}  // namespace palisade
