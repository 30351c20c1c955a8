#include "Host/Daemon/ClientLanes.h"

namespace palisade {

ClientLanes::Turn ClientLanes::enter(const std::string& client, Bound bound, const std::function<void()>& beforeWaiting) {
  std::unique_lock lock(_mutex);
  Lane& lane = _lanes[client];
  if (bound == Bound::kept && lane.size() >= _longest) {
    throw LaneIsFull("This application has " + std::to_string(_longest) +
                     " unanswered requests already. Wait for an answer, or close one.");
  }
  const std::uint64_t ticket = _nextTicket++;
  lane.push_back(ticket);
  try {
    waitUntil(lock, beforeWaiting, [&] { return lane.front() == ticket && !_isTakenByOne; });
  } catch (...) {
    giveUp(client, ticket);
    throw;
  }
  ++_active;
  return {*this, client};
}

ClientLanes::Turn ClientLanes::enterAll(const std::function<void()>& beforeWaiting) {
  std::unique_lock lock(_mutex);
  waitUntil(lock, beforeWaiting, [&] { return !_isTakenByOne; });
  _isTakenByOne = true;
  try {
    waitUntil(lock, beforeWaiting, [&] { return _active == 0; });
  } catch (...) {
    leave(std::nullopt);
    throw;
  }
  return {*this, std::nullopt};
}

void ClientLanes::waitUntil(std::unique_lock<std::mutex>& lock, const std::function<void()>& beforeWaiting,
                            const std::function<bool()>& isTrue) {
  if (isTrue()) return;
  lock.unlock();
  beforeWaiting();
  lock.lock();
  _hasMoved.wait(lock, isTrue);
}

void ClientLanes::giveUp(const std::string& client, std::uint64_t ticket) {
  {
    const std::lock_guard lock(_mutex);
    const auto lane = _lanes.find(client);
    std::erase(lane->second, ticket);
    if (lane->second.empty()) _lanes.erase(lane);
  }
  _hasMoved.notify_all();
}

void ClientLanes::leave(const std::optional<std::string>& client) {
  {
    const std::lock_guard lock(_mutex);
    if (client) {
      --_active;
      const auto lane = _lanes.find(*client);
      lane->second.pop_front();
      if (lane->second.empty()) _lanes.erase(lane);
    } else {
      _isTakenByOne = false;
    }
  }
  _hasMoved.notify_all();
}

}  // namespace palisade
