#include "Testing/Settling.h"

#include <algorithm>
#include <chrono>
#include <list>
#include <thread>
#include <utility>

#include "Testing/Activity.h"

namespace palisade {
namespace {

// How long work is given before the kernel is asked whether it waits: a little at first, because most work is short, then
// longer each time. The end of the work itself is noticed at once.
constexpr std::chrono::microseconds firstPause{50};
constexpr std::chrono::microseconds longestPause{1000};

std::list<std::shared_ptr<Worker>>& workersOfThisProcess() {
  static auto& workers = *new std::list<std::shared_ptr<Worker>>;
  return workers;
}

}  // namespace

std::shared_ptr<const Worker> runUntilAtRest(ThreadLabel label, std::function<void()> work) {
  auto& workers = workersOfThisProcess();
  const auto worker = std::make_shared<Worker>(label, std::move(work));
  workers.push_back(worker);
  for (auto pause = firstPause;; pause = std::min(2 * pause, longestPause)) {
    const bool hasFinished = worker->waitFor(pause);
    std::erase_if(workers, [](const auto& each) { return each->joinIfFinished(); });
    if (Activity::everythingRests()) return worker;
    if (hasFinished) std::this_thread::sleep_for(pause);
  }
}

}  // namespace palisade
