#pragma once

/// Writes the history of requests behind them: a request that a grant answers does not wait for the disk.
///
/// Entries are collected for a moment and stored in one transaction, in the order in which they came. A request that the user
/// was asked about waits for `flush`, which whoever carries the request calls while the server is at work and when it ends.
/// What stands in memory when the process is killed, a quarter of a second at most, is lost; no grant depends on it.
///
/// Threads: every operation may be called from any thread; a thread of its own writes what nobody flushes. Ownership: borrows
/// the store. Errors: entries that cannot be stored are dropped, and `onFailure` is told on the writing thread.

#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <functional>
#include <mutex>
#include <thread>
#include <vector>

#include "Host/Accounts/SqliteAccountStore.h"

namespace palisade {

class AccessHistory {
 public:
  AccessHistory(SqliteAccountStore& store, std::function<void(const Error&)> onFailure);

  /// Stores what is left.
  ~AccessHistory();

  AccessHistory(const AccessHistory&) = delete;
  AccessHistory& operator=(const AccessHistory&) = delete;

  void append(const AccessRequestRecord& record, Date at);

  /// Returns when everything that was appended before the call is stored.
  void flush();

  /// Newest first, with everything that was appended before the call.
  std::vector<HistoryEntry> entries(const HistoryFilter& filter);

 private:
  static constexpr std::chrono::milliseconds longestDelay{250};
  static constexpr std::size_t largestBatch = 1000;

  void write();
  void writeBatch(std::unique_lock<std::mutex>& lock);

  SqliteAccountStore& _store;
  const std::function<void(const Error&)> _onFailure;
  std::mutex _mutex;
  std::condition_variable _hasWork;
  std::condition_variable _hasWritten;
  std::vector<HistoryEntry> _waiting;
  std::uint64_t _appended = 0;
  std::uint64_t _written = 0;
  bool _isDue = false;  // something waits that nobody will flush
  bool _isWriting = false;
  bool _isEnding = false;
  std::thread _writer;
};

}  // namespace palisade
