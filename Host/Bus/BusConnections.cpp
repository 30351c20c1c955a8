#include "Host/Bus/BusConnections.h"

#include <unistd.h>

#include <algorithm>
#include <ctime>
#include <iterator>

namespace palisade {
namespace {

// Names that the bus gives out begin with a colon; one connection has one of them, and it is never given out again.
bool isUniqueName(const std::string& name) { return name.starts_with(':'); }

}  // namespace

std::uint64_t clockTicksSinceBoot() {
  constexpr std::uint64_t nanosecondsOfASecond = 1'000'000'000;
  static const auto ticksOfASecond = static_cast<std::uint64_t>(sysconf(_SC_CLK_TCK));
  timespec now{};
  clock_gettime(CLOCK_BOOTTIME, &now);
  return static_cast<std::uint64_t>(now.tv_sec) * ticksOfASecond +
         static_cast<std::uint64_t>(now.tv_nsec) / (nanosecondsOfASecond / ticksOfASecond);
}

void BusConnections::wereThere(const std::vector<std::string>& names) {
  const std::uint64_t now = _now();
  const std::lock_guard lock(_mutex);
  for (const std::string& name : names) {
    if (!isUniqueName(name)) continue;
    _connections.try_emplace(name, Connection{.existedAt = now, .isOlderThanDaemon = true});
  }
}

void BusConnections::appeared(const std::string& name) {
  if (!isUniqueName(name)) return;
  const std::uint64_t now = _now();
  const std::lock_guard lock(_mutex);
  _connections.try_emplace(name, Connection{.existedAt = now, .isOlderThanDaemon = false});
}

void BusConnections::vanished(const std::string& name) {
  const std::lock_guard lock(_mutex);
  if (_connections.erase(name) > 0) _oneHasEnded.notify_all();
}

std::optional<BusConnections::Connection> BusConnections::find(const std::string& uniqueName) const {
  const std::lock_guard lock(_mutex);
  const auto found = _connections.find(uniqueName);
  return found == _connections.end() ? std::nullopt : std::optional(found->second);
}

std::vector<std::string> BusConnections::madeBy(pid_t process, std::uint64_t sinceTick) {
  std::vector<std::string> made;
  std::vector<std::string> toAsk;
  {
    const std::lock_guard lock(_mutex);
    for (const auto& [name, connection] : _connections) {
      if (connection.existedAt < sinceTick) continue;
      if (!connection.process) {
        toAsk.push_back(name);
      } else if (connection.process == process) {
        made.push_back(name);
      }
    }
  }
  for (const std::string& name : toAsk) {
    const auto answer = _askProcess(name);
    if (answer == process) made.push_back(name);
    const std::lock_guard lock(_mutex);
    const auto found = _connections.find(name);
    if (found == _connections.end()) continue;
    if (answer) {
      found->second.process = answer;
    } else {
      _connections.erase(found);
      _oneHasEnded.notify_all();
    }
  }
  return made;
}

std::vector<std::string> BusConnections::awaitEnd(const std::vector<std::string>& uniqueNames,
                                                  std::chrono::steady_clock::time_point deadline) {
  std::vector<std::string> left;
  const auto hasOneEnded = [&] {
    left.clear();
    std::copy_if(uniqueNames.begin(), uniqueNames.end(), std::back_inserter(left),
                 [&](const std::string& name) { return _connections.contains(name); });
    return left.size() < uniqueNames.size();
  };
  std::unique_lock lock(_mutex);
  _oneHasEnded.wait_until(lock, deadline, hasOneEnded);
  return left;
}

void BusConnections::confirm(const std::vector<std::string>& uniqueNames, std::uint64_t startTick) {
  const std::lock_guard lock(_mutex);
  for (const std::string& name : uniqueNames) {
    if (const auto found = _connections.find(name); found != _connections.end()) found->second.ownerStart = startTick;
  }
}

}  // namespace palisade
