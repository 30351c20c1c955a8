#pragma once

/// One labelled thread with one piece of work, which may never end.
///
/// Threads: owned and asked by one thread. Ownership: a worker that has finished is joined, one that is stuck is left behind,
/// so whatever its work uses has to live as long as the process. Errors: an exception that leaves the work ends the process.

#include <chrono>
#include <condition_variable>
#include <functional>
#include <memory>
#include <mutex>
#include <thread>
#include <utility>

#include "Testing/Trace.h"

namespace palisade {

class Worker {
 public:
  Worker(ThreadLabel label, std::function<void()> work)
      : _end(std::make_shared<End>()),
        _thread([label, work = std::move(work), end = _end]() mutable {
          const ThreadLabelScope scope(label);
          work();
          work = nullptr;
          const std::lock_guard lock(end->mutex);
          end->hasCome = true;
          end->came.notify_all();
        }),
        _id(_thread.get_id()) {}

  ~Worker() {
    if (!_thread.joinable()) return;
    if (hasFinished()) {
      _thread.join();
    } else {
      _thread.detach();
    }
  }

  Worker(const Worker&) = delete;
  Worker& operator=(const Worker&) = delete;

  std::thread::id id() const { return _id; }

  bool hasFinished() const {
    const std::lock_guard lock(_end->mutex);
    return _end->hasCome;
  }

  /// Waits for the end of the work, at most that long, and then for the end of the thread.
  bool joinWithin(std::chrono::microseconds time) {
    {
      std::unique_lock lock(_end->mutex);
      if (!_end->came.wait_for(lock, time, [this] { return _end->hasCome; })) return false;
    }
    if (_thread.joinable()) _thread.join();
    return true;
  }

 private:
  struct End {
    std::mutex mutex;
    std::condition_variable came;
    bool hasCome = false;
  };

  std::shared_ptr<End> _end;
  std::thread _thread;
  std::thread::id _id;
};

}  // namespace palisade
