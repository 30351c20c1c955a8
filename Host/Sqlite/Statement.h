#pragma once

/// One prepared query, kept for the life of its connection, and one run of it.
///
///     Statement find(database, "find a grant", "SELECT granted FROM grants WHERE client = ?1");
///     Statement::Run run = find.run(clientID);
///     if (run.next()) use(run.integer(0));
///
/// Threads: those of its `Database`, one at a time. Ownership: a statement lives no longer than its database, a run no longer
/// than its statement; destroying a run resets the statement, and a statement has one run at a time. Errors: `SqliteError` with
/// the purpose that the statement was given. A column of another type than the one asked for is damage: tables are strict.

#include <concepts>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

struct sqlite3_stmt;

namespace palisade {

class Database;

/// Bytes to be bound as a BLOB; borrowed.
struct BlobView {
  std::string_view bytes;
};

class Statement {
 public:
  class Run {
   public:
    Run(const Run&) = delete;
    Run& operator=(const Run&) = delete;
    ~Run();

    /// Steps to the next row; false after the last.
    bool next();

    std::int64_t integer(int column) const;
    bool boolean(int column) const { return integer(column) != 0; }
    double real(int column) const;
    std::string text(int column) const;
    std::optional<std::string> optionalText(int column) const;
    std::string blob(int column) const;

   private:
    friend class Statement;
    explicit Run(const Statement& statement) : _statement(statement) {}

    void expectType(int column, int type) const;
    bool isNull(int column) const;

    const Statement& _statement;
  };

  /// `purpose` completes "cannot ..." in errors; it and `sql` outlive the statement.
  Statement(Database& database, std::string_view purpose, std::string_view sql);

  /// Binds the arguments to ?1, ?2, ... and begins a run.
  template <typename... Arguments>
  Run run(const Arguments&... arguments) const {
    int position = 0;
    (bind(++position, arguments), ...);
    return Run(*this);
  }

  /// Runs to the end and answers how many rows were changed.
  template <typename... Arguments>
  std::int64_t execute(const Arguments&... arguments) const {
    Run all = run(arguments...);
    while (all.next()) {
    }
    return changes();
  }

 private:
  struct Finalizer {
    void operator()(sqlite3_stmt* statement) const;
  };

  template <std::integral Integer>
  void bind(int position, Integer value) const {
    bindInteger(position, static_cast<std::int64_t>(value));
  }
  void bind(int position, double value) const;
  void bind(int position, std::string_view text) const;
  void bind(int position, BlobView blob) const;
  template <typename Content>
  void bind(int position, const std::optional<Content>& content) const {
    if (content) {
      bind(position, *content);
    } else {
      bindNull(position);
    }
  }
  void bindInteger(int position, std::int64_t value) const;
  void bindNull(int position) const;
  std::int64_t changes() const;
  void check(int resultCode) const;

  const Database& _database;
  std::string_view _purpose;
  std::unique_ptr<sqlite3_stmt, Finalizer> _statement;
};

}  // namespace palisade
