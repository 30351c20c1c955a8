#pragma once

/// The connections of one store: one that writes, and a few that read beside it.
///
/// `Writer` and `Reader` hold the statements of their connection; each is made from a `Database&`.
/// Threads: `write` and `read` may be called from any thread. Writes run one at a time; reads run beside writes and each other,
/// and see what was stored when they began. The work must not call out of the store, nor begin another read or write.
/// Ownership: owns the connections. Errors: whatever the work throws reaches the caller.

#include <condition_variable>
#include <memory>
#include <mutex>
#include <utility>
#include <vector>

#include "Host/Sqlite/Database.h"

namespace palisade {

template <typename Writer, typename Reader>
class Connections {
 public:
  explicit Connections(std::unique_ptr<Database> database) : _database(std::move(database)), _writer(*_database) {}

  const Database& database() const { return *_database; }

  template <typename Work>
  auto write(Work work) {
    const std::lock_guard lock(_writing);
    return work(*_database, _writer);
  }

  template <typename Work>
  auto read(Work work) {
    const Loan loan(*this);
    return work(loan.reader());
  }

 private:
  // More readers than this have to wait: the time of a read is spent in the processor, not on the disk.
  static constexpr std::size_t greatestReaderCount = 4;

  struct ReadConnection {
    explicit ReadConnection(std::unique_ptr<Database> connection) : database(std::move(connection)), statements(*database) {}
    std::unique_ptr<Database> database;
    Reader statements;
  };

  class Loan {
   public:
    explicit Loan(Connections& connections) : _connections(connections), _connection(connections.lend()) {}
    Loan(const Loan&) = delete;
    Loan& operator=(const Loan&) = delete;
    ~Loan() { _connections.takeBack(std::move(_connection)); }
    const Reader& reader() const { return _connection->statements; }

   private:
    Connections& _connections;
    std::unique_ptr<ReadConnection> _connection;
  };

  std::unique_ptr<ReadConnection> lend() {
    std::unique_lock lock(_reading);
    _returned.wait(lock, [this] { return !_idle.empty() || _readerCount < greatestReaderCount; });
    if (!_idle.empty()) {
      std::unique_ptr<ReadConnection> connection = std::move(_idle.back());
      _idle.pop_back();
      return connection;
    }
    auto connection = std::make_unique<ReadConnection>(_database->openReader());
    _idle.reserve(++_readerCount);
    return connection;
  }

  void takeBack(std::unique_ptr<ReadConnection> connection) noexcept {
    {
      const std::lock_guard lock(_reading);
      _idle.push_back(std::move(connection));
    }
    _returned.notify_one();
  }

  std::unique_ptr<Database> _database;

  std::mutex _writing;
  Writer _writer;  // used under _writing, as is the connection itself

  std::mutex _reading;
  std::condition_variable _returned;
  std::vector<std::unique_ptr<ReadConnection>> _idle;  // under _reading, as is the count
  std::size_t _readerCount = 0;
};

}  // namespace palisade
