#include "Testing/Activity.h"

#include <cstdint>
#include <mutex>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include <unistd.h>

#include "Testing/EndlessWait.h"

namespace palisade {

/// All activities of this process; guards their members too.
struct ActivityRegistry {
  std::mutex mutex;
  std::set<Activity*> activities;
  std::uint64_t changes = 0;

  static ActivityRegistry& instance() {
    static auto& registry = *new ActivityRegistry;
    return registry;
  }

  /// The threads that have something to do, one that is only starting as 0, and the number of changes so far.
  std::pair<std::vector<pid_t>, std::uint64_t> busyThreads() {
    const std::lock_guard lock(mutex);
    std::vector<pid_t> threads;
    for (const Activity* activity : activities) {
      if (activity->_toDo > 0) threads.push_back(activity->_thread);
    }
    return {std::move(threads), changes};
  }
};

namespace {

struct Look {
  std::vector<std::string> waits;
  std::uint64_t changes = 0;

  friend bool operator==(const Look&, const Look&) = default;
};

// How every busy thread waits; none when one of them does not.
std::optional<Look> look() {
  const auto [threads, changes] = ActivityRegistry::instance().busyThreads();
  Look result{.waits = {}, .changes = changes};
  for (const pid_t thread : threads) {
    auto wait = thread == 0 ? std::nullopt : endlessWaitOf(thread);
    if (!wait) return std::nullopt;
    result.waits.push_back(*std::move(wait));
  }
  return result;
}

}  // namespace

Activity::Activity() {
  auto& registry = ActivityRegistry::instance();
  const std::lock_guard lock(registry.mutex);
  registry.activities.insert(this);
}

Activity::~Activity() {
  auto& registry = ActivityRegistry::instance();
  const std::lock_guard lock(registry.mutex);
  registry.activities.erase(this);
}

void Activity::begin() {
  auto& registry = ActivityRegistry::instance();
  const std::lock_guard lock(registry.mutex);
  ++_toDo;
  ++registry.changes;
}

void Activity::end() {
  auto& registry = ActivityRegistry::instance();
  const std::lock_guard lock(registry.mutex);
  --_toDo;
  ++registry.changes;
}

void Activity::runsHere() {
  auto& registry = ActivityRegistry::instance();
  const std::lock_guard lock(registry.mutex);
  _thread = gettid();
}

bool Activity::everythingRests() {
  // Two looks alike: between the end of the first and the start of the second, all of them slept at once.
  const auto first = look();
  return first && first == look();
}

}  // namespace palisade
