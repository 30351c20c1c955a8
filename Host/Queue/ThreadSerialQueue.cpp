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
  _hasWork.notify_one();
  if (_thread.joinable()) _thread.join();
}

void ThreadSerialQueue::async(std::function<void()> work) {
  {
    const std::lock_guard lock(_mutex);
    _work.push_back(std::move(work));
    if (!_thread.joinable()) _thread = std::thread([this] { run(); });
  }
  _hasWork.notify_one();
}

void ThreadSerialQueue::sync(const std::function<void()>& work) {
  std::packaged_task<void()> task([&] { work(); });
  auto done = task.get_future();
  async([&] { task(); });
  done.get();
}

void ThreadSerialQueue::run() {
  pthread_setname_np(pthread_self(), threadName(_label).c_str());
  std::unique_lock lock(_mutex);
  while (true) {
    _hasWork.wait(lock, [&] { return !_work.empty() || _isEnding; });
    if (_work.empty()) return;
    const auto work = std::move(_work.front());
    _work.pop_front();
    lock.unlock();
    work();
    lock.lock();
  }
}

}  // namespace palisade
