#include "Host/Accounts/AccessHistory.h"

#include <utility>

namespace palisade {

AccessHistory::AccessHistory(SqliteAccountStore& store, std::function<void(const Error&)> onFailure)
    : _store(store),
      _onFailure(std::move(onFailure)),
      _writer([this] { write(); }) {}

AccessHistory::~AccessHistory() {
  {
    const std::lock_guard lock(_mutex);
    _isEnding = true;
  }
  _hasWork.notify_one();
  _writer.join();
}

void AccessHistory::append(const AccessRequestRecord& record, Date at) {
  bool wakesWriter = false;
  {
    const std::lock_guard lock(_mutex);
    _waiting.push_back({.last = at,
                        .accountTypeIdentifier = std::string(record.accountTypeIdentifier),
                        .bundleID = record.bundleID,
                        .granted = record.granted,
                        .userPrompted = record.userPrompted,
                        .elapsedSeconds = record.elapsedSeconds});
    ++_appended;
    const bool wasDue = _isDue;
    _isDue |= !record.userPrompted || _waiting.size() >= largestBatch;
    wakesWriter = (_isDue && !wasDue) || _waiting.size() == largestBatch;
  }
  if (wakesWriter) _hasWork.notify_one();
}

void AccessHistory::flush() {
  std::unique_lock lock(_mutex);
  const std::uint64_t last = _appended;
  while (_written < last) {
    if (_isWriting) {
      _hasWritten.wait(lock);
    } else {
      writeBatch(lock);
    }
  }
}

std::vector<HistoryEntry> AccessHistory::entries(const HistoryFilter& filter) {
  flush();
  return _store.history(filter);
}

void AccessHistory::write() {
  std::unique_lock lock(_mutex);
  while (true) {
    _hasWork.wait(lock, [&] { return _isEnding || _isDue; });
    _hasWork.wait_for(lock, longestDelay, [&] { return _isEnding || _waiting.size() >= largestBatch; });
    _isDue = false;
    _hasWritten.wait(lock, [&] { return !_isWriting; });
    if (!_waiting.empty()) writeBatch(lock);
    if (_isEnding && _waiting.empty()) return;
  }
}

void AccessHistory::writeBatch(std::unique_lock<std::mutex>& lock) {
  const std::vector<HistoryEntry> batch = std::exchange(_waiting, {});
  _isWriting = true;
  lock.unlock();
  const auto error = _store.appendToHistory(batch);
  if (error) _onFailure(*error);
  lock.lock();
  _isWriting = false;
  _written += batch.size();
  _hasWritten.notify_all();
}

}  // namespace palisade
