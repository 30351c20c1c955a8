#pragma once

/// One change of a store, of as many statements as it takes: all of it is stored, or none.
///
/// It takes the store's write lock when it begins, so that it never fails half-way because somebody else was faster.
/// Threads: those of its `Database`. Ownership: lives no longer than the database. Errors: `SqliteError` from the beginning and
/// from `commit`, after which nothing of it is stored. A transaction that is destroyed without `commit` leaves nothing.

namespace palisade {

class Database;

class Transaction {
 public:
  explicit Transaction(Database& database);
  Transaction(const Transaction&) = delete;
  Transaction& operator=(const Transaction&) = delete;
  ~Transaction();

  /// Returns when the change is on the disk.
  void commit();

 private:
  Database& _database;
  bool _isOpen = true;
};

}  // namespace palisade
