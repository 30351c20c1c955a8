#include "Host/Http/DeliveryThreads.h"

#include <system_error>
#include <utility>

#include "Host/Http/QuietThread.h"
#include "Host/Secrets/Wipe.h"

namespace palisade {

void DeliveryThreads::start() {
  const std::lock_guard lock(_mutex);
  if (_threads.empty()) _threads.push_back(startQuietThread("http-answers", [this] { run(); }));
}

void DeliveryThreads::deliver(std::function<void()> work) {
  {
    const std::lock_guard lock(_mutex);
    _work.push_back(std::move(work));
    if (_work.size() > _idle && _threads.size() < mostThreads) startAnother();
  }
  _changed.notify_one();
}

void DeliveryThreads::startAnother() {
  try {
    _threads.push_back(startQuietThread("http-answers", [this] { run(); }));
  } catch (const std::system_error&) {
    // The threads that there are will come to it.
  }
}

void DeliveryThreads::end() {
  std::vector<std::thread> threads;
  {
    const std::lock_guard lock(_mutex);
    _ending = true;
    threads.swap(_threads);
  }
  _changed.notify_all();
  for (std::thread& thread : threads) thread.join();
}

void DeliveryThreads::run() {
  std::unique_lock lock(_mutex);
  while (true) {
    ++_idle;
    _changed.wait(lock, [this] { return !_work.empty() || _ending; });
    --_idle;
    if (_work.empty()) return;
    std::function<void()> work = std::move(_work.front());
    _work.pop_front();
    lock.unlock();
    work();
    work = nullptr;  // what the work owned goes before the lock is taken again
    wipeDeadStack();
    lock.lock();
  }
}

}  // namespace palisade
