#include "Testing/Settling.h"

#include <algorithm>
#include <chrono>
#include <list>
#include <optional>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "Testing/FakeSerialQueue.h"

namespace palisade {
namespace {

using Workers = std::list<std::shared_ptr<const Worker>>;

// How long work is given before the kernel is asked whether it waits: a little at first, because most work is short, then
// longer each time. The end of the work itself is noticed at once.
constexpr std::chrono::microseconds firstPause{50};
constexpr std::chrono::microseconds longestPause{1000};

Workers& workersOfThisProcess() {
  static auto& workers = *new Workers;
  return workers;
}

// How every worker that has not finished waits; none when one of them does not.
std::optional<std::vector<std::string>> endlessWaits(const Workers& workers) {
  std::vector<std::string> waits;
  for (const auto& worker : workers) {
    if (worker->hasFinished()) continue;
    auto wait = worker->endlessWait();
    if (!wait) return std::nullopt;
    waits.push_back(*std::move(wait));
  }
  return waits;
}

bool isAtRest(const Workers& workers) {
  const auto work = FakeSerialQueue::workInProcess();
  if (!work.isDone()) return false;
  // Two looks alike: between the end of the first and the start of the second, all of them slept at once.
  const auto waits = endlessWaits(workers);
  if (!waits) return false;
  if (!waits->empty() && waits != endlessWaits(workers)) return false;
  return work.given == FakeSerialQueue::workInProcess().given;
}

}  // namespace

std::shared_ptr<const Worker> runUntilAtRest(ThreadLabel label, std::function<void()> work) {
  Workers& workers = workersOfThisProcess();
  const auto worker = std::make_shared<const Worker>(label, std::move(work));
  workers.push_back(worker);
  auto pause = firstPause;
  do {
    if (worker->waitFor(pause)) std::this_thread::yield();
    pause = std::min(2 * pause, longestPause);
  } while (!isAtRest(workers));
  std::erase_if(workers, [](const auto& each) { return each->hasFinished(); });
  return worker;
}

}  // namespace palisade
