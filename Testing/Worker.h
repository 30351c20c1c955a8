#pragma once

/// One labelled thread with one piece of work, which may never end.
///
/// Threads: owned and asked by one thread. Ownership: a worker that has finished is joined, one that waits for ever is left
/// behind, so whatever its work uses has to live as long as the process. Errors: an exception that leaves the work ends the
/// process.

#include <chrono>
#include <condition_variable>
#include <functional>
#include <memory>
#include <mutex>
#include <thread>

#include "Testing/Activity.h"
#include "Testing/Trace.h"

namespace palisade {

class Worker {
 public:
  Worker(ThreadLabel label, std::function<void()> work);
  ~Worker();

  Worker(const Worker&) = delete;
  Worker& operator=(const Worker&) = delete;

  std::thread::id id() const { return _id; }

  bool hasFinished() const;

  /// Waits for the end of the thread when its work has ended. Whether it has.
  bool joinIfFinished();

  /// Waits for the end of the work, at most that long. Whether it has ended.
  bool waitFor(std::chrono::microseconds time) const;

 private:
  struct State {
    std::mutex mutex;
    std::condition_variable changed;
    bool hasFinished = false;
    Activity activity;
  };

  std::shared_ptr<State> _state;
  std::thread _thread;
  std::thread::id _id;
};

}  // namespace palisade
