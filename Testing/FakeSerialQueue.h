#pragma once

/// Serial queues with a real thread each. See `SerialQueue`.
///
/// Threads: as the interface says; a queue's thread carries the label `preferences`. Errors: an exception that leaves
/// asynchronous work ends the process, as it would end the daemon.

#include <condition_variable>
#include <cstddef>
#include <deque>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

#include "Platform/SerialQueue.h"
#include "Testing/Activity.h"
#include "Testing/Instruments.h"

namespace palisade {

class FakeSerialQueue final : public SerialQueue {
 public:
  FakeSerialQueue(Instruments instruments, std::string_view label);
  ~FakeSerialQueue() override;

  /// The label of the queue whose work the calling thread carries out, or none.
  static std::optional<std::string> labelOfCurrent();

  const std::string& label() const override;
  void async(std::function<void()> work) override;
  void sync(const std::function<void()>& work) override;

  /// Waits until the queue has nothing left to do.
  void drain();

 private:
  void push(std::function<void()> work);
  std::optional<std::function<void()>> next();
  void finishOne();
  void run();

  Instruments _instruments;
  const std::string _label;
  std::mutex _mutex;
  std::condition_variable _changed;
  std::deque<std::function<void()>> _work;
  std::size_t _unfinished = 0;
  bool _isClosing = false;
  Activity _activity;
  std::thread _thread;
};

class FakeSerialQueueFactory final : public SerialQueueFactory {
 public:
  explicit FakeSerialQueueFactory(Instruments instruments) : _instruments(instruments) {}

  std::shared_ptr<SerialQueue> makeSerialQueue(std::string_view label) override;

  /// Waits until every queue that still lives has nothing left to do.
  void drain();

 private:
  Instruments _instruments;
  std::mutex _mutex;
  std::vector<std::weak_ptr<FakeSerialQueue>> _queues;
};

}  // namespace palisade
