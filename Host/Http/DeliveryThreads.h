#pragma once

/// Runs handlers away from the thread that found out what they are told.
///
/// Threads: `deliver` may be called from any thread. A thread is added when all are busy, up to eight; what comes then waits.
/// Ownership: the work owns what it uses. Errors: work must not throw. `start` throws when not even one thread can be had.

#include <condition_variable>
#include <cstddef>
#include <deque>
#include <functional>
#include <mutex>
#include <thread>
#include <vector>

namespace palisade {

class DeliveryThreads {
 public:
  DeliveryThreads() = default;
  DeliveryThreads(const DeliveryThreads&) = delete;
  DeliveryThreads& operator=(const DeliveryThreads&) = delete;
  ~DeliveryThreads() { end(); }

  /// Makes sure that there is a thread. Call it before the first `deliver`.
  void start();

  void deliver(std::function<void()> work);

  /// Returns when all work has run. Nothing may be delivered afterwards.
  void end();

 private:
  static constexpr std::size_t mostThreads = 8;

  void startAnother();
  void run();

  std::mutex _mutex;
  std::condition_variable _changed;
  std::deque<std::function<void()>> _work;
  std::vector<std::thread> _threads;
  std::size_t _idle = 0;
  bool _ending = false;
};

}  // namespace palisade
