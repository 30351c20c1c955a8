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
    _waiting.push_back({.at = at,
                        .accountTypeIdentifier = std::string(record.accountTypeIdentifier),
                        .bundleID = record.bundleID,
                        .granted = record.granted,
                        .userPrompted = record.userPrompted,
                        .elapsedSeconds = record.elapsedSeconds});
    ++_appended;
    _isUrgent |= record.userPrompted || _waiting.size() >= largestBatch;
    wakesWriter = _isUrgent || _waiting.size() == 1;
  }
  if (wakesWriter) _hasWork.notify_one();
}

std::vector<HistoryEntry> AccessHistory::entries(const HistoryFilter& filter) {
  {
    std::unique_lock lock(_mutex);
    const std::uint64_t last = _appended;
    _isUrgent |= !_waiting.empty();
    _hasWork.notify_one();
    _hasWritten.wait(lock, [&] { return _written >= last; });
  }
  return _store.history(filter);
}

void AccessHistory::write() {
  std::unique_lock lock(_mutex);
  while (true) {
    _hasWork.wait(lock, [&] { return _isEnding || !_waiting.empty(); });
    if (_waiting.empty()) return;
    _hasWork.wait_for(lock, longestDelay, [&] { return _isEnding || _isUrgent; });
    const std::vector<HistoryEntry> batch = std::exchange(_waiting, {});
    _isUrgent = false;
    lock.unlock();
    const auto error = _store.appendToHistory(batch);
    if (error) _onFailure(*error);
    lock.lock();
    _written += batch.size();
    _hasWritten.notify_all();
  }
}

}  // namespace palisade
