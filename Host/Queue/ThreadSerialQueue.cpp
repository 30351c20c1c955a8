#include "Host/Queue/ThreadSerialQueue.h"

#include <pthread.h>

#include <future>

namespace palisade {
namespace {

// The kernel keeps 15 characters of a thread's name.
std::string threadName(const std::string& label) {
  const std::size_t dot = label.rfind('.');
  return label.substr(dot == std::string::npos ? 0 : dot + 1).substr(0, 15);
}

}  // namespace

ThreadSerialQueue::~ThreadSerialQueue() {
  {
    const std::lock_guard lock(_mutex);
    _isEnding = true;
  }
  _changed.notify_one();
  if (_thread.joinable()) _thread.join();
}

void ThreadSerialQueue::async(std::function<void()> work) {
  {
    const std::lock_guard lock(_mutex);
    _work.push_back(std::move(work));
    if (!_thread.joinable()) _thread = std::thread([this] { run(); });
  }
  _changed.notify_one();
}

void ThreadSerialQueue::sync(const std::function<void()>& work) {
  _beforeWaiting();
  if (runAtOnce(work)) return;
  std::packaged_task<void()> task([&] { work(); });
  auto done = task.get_future();
  async([&] { task(); });
  done.get();
}

// Only where nothing runs or waits: work keeps to its order.
bool ThreadSerialQueue::runAtOnce(const std::function<void()>& work) {
  {
    const std::lock_guard lock(_mutex);
    if (_isRunning || !_work.empty()) return false;
    _isRunning = true;
  }
  const auto finish = [this] {
    {
      const std::lock_guard lock(_mutex);
      _isRunning = false;
    }
    _changed.notify_one();
  };
  try {
    work();
  } catch (...) {
    finish();
    throw;
  }
  finish();
  return true;
}

void ThreadSerialQueue::run() {
  pthread_setname_np(pthread_self(), threadName(_label).c_str());
  std::unique_lock lock(_mutex);
  while (true) {
    _changed.wait(lock, [&] { return !_isRunning && (!_work.empty() || _isEnding); });
    if (_work.empty()) return;
    const auto work = std::move(_work.front());
    _work.pop_front();
    _isRunning = true;
    lock.unlock();
    work();
    lock.lock();
    _isRunning = false;
  }
}

}  // namespace palisade
