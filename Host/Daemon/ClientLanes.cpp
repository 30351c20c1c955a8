#include "Host/Daemon/ClientLanes.h"

namespace palisade {

ClientLanes::Place ClientLanes::enter(const std::string& client, const std::function<void()>& beforeWaiting) {
  std::unique_lock lock(_mutex);
  Lane& lane = _lanes[client];
  if (lane.size() >= _longest) {
    throw LaneIsFull("This application has " + std::to_string(_longest) +
                     " unanswered requests already. Wait for an answer, or close one.");
  }
  const std::uint64_t ticket = _nextTicket++;
  lane.push_back(ticket);
  const auto isItsTurn = [&] { return lane.front() == ticket && !isHeld(client); };
  if (!isItsTurn()) {
    lock.unlock();
    try {
      beforeWaiting();
    } catch (...) {
      leave(client, ticket);
      throw;
    }
    lock.lock();
    _hasMoved.wait(lock, isItsTurn);
  }
  return Place([this, client, ticket] { leave(client, ticket); });
}

ClientLanes::Place ClientLanes::hold(const std::string& client) {
  std::unique_lock lock(_mutex);
  _hasMoved.wait(lock, [&] { return !isHeld(client); });
  _held.insert(client);
  return Place([this, client] {
    {
      const std::lock_guard guard(_mutex);
      _held.erase(client);
    }
    _hasMoved.notify_all();
  });
}

ClientLanes::Place ClientLanes::holdAll() {
  std::unique_lock lock(_mutex);
  _hasMoved.wait(lock, [&] { return !_allAreHeld; });
  _allAreHeld = true;
  _hasMoved.wait(lock, [&] { return _held.empty(); });
  return Place([this] {
    {
      const std::lock_guard guard(_mutex);
      _allAreHeld = false;
    }
    _hasMoved.notify_all();
  });
}

void ClientLanes::leave(const std::string& client, std::uint64_t ticket) {
  {
    const std::lock_guard lock(_mutex);
    const auto lane = _lanes.find(client);
    std::erase(lane->second, ticket);
    if (lane->second.empty()) _lanes.erase(lane);
  }
  _hasMoved.notify_all();
}

}  // namespace palisade
