#include "Host/Daemon/ClientLanes.h"

namespace palisade {

ClientLanes::Turn ClientLanes::enter(const std::string& client, Bound bound, const std::function<void()>& beforeWaiting) {
  std::unique_lock lock(_mutex);
  Lane& lane = _lanes[client];
  if (bound == Bound::kept && lane.nextTicket - lane.served >= _longest) {
    throw LaneIsFull("This application has " + std::to_string(_longest) +
                     " unanswered requests already. Wait for an answer, or close one.");
  }
  const std::uint64_t ticket = lane.nextTicket++;
  waitUntil(lock, beforeWaiting, [&] { return lane.served == ticket && !_isTakenByOne; });
  ++_active;
  return {*this, client};
}

ClientLanes::Turn ClientLanes::enterAll(const std::function<void()>& beforeWaiting) {
  std::unique_lock lock(_mutex);
  waitUntil(lock, beforeWaiting, [&] { return !_isTakenByOne; });
  _isTakenByOne = true;
  waitUntil(lock, beforeWaiting, [&] { return _active == 0; });
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

void ClientLanes::leave(const std::optional<std::string>& client) {
  {
    const std::lock_guard lock(_mutex);
    if (client) {
      --_active;
      const auto lane = _lanes.find(*client);
      if (++lane->second.served == lane->second.nextTicket) _lanes.erase(lane);
    } else {
      _isTakenByOne = false;
    }
  }
  _hasMoved.notify_all();
}

}  // namespace palisade
