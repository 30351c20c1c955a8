#pragma once

/// Serial queues with a real thread each. See `SerialQueue`.
///
/// Threads: as the interface says; a queue's thread carries the label `preferences`. Errors: an exception that leaves
/// asynchronous work ends the process, as it would end the daemon.

#include <condition_variable>
#include <cstdint>
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
#include "Testing/Instruments.h"

namespace palisade {

class FakeSerialQueue final : public SerialQueue {
 public:
  FakeSerialQueue(Instruments instruments, std::string_view label);
  ~FakeSerialQueue() override;

  /// Pieces of work that were given to the queues of this process, and those of them that have been done.
  struct Work {
    std::uint64_t given = 0;
    std::uint64_t done = 0;

    bool isDone() const { return given == done; }
  };
  static Work workInProcess();

  /// The label of the queue whose work the calling thread carries out, or none.
  static std::optional<std::string> labelOfCurrent();

  const std::string& label() const override;
  void async(std::function<void()> work) override;
  void sync(const std::function<void()>& work) override;

  /// Waits until the queue has nothing left to do.
  void drain();

 private:
  void push(std::function<void()> work);
  void run();

  Instruments _instruments;
  const std::string _label;
  std::mutex _mutex;
  std::condition_variable _changed;
  std::deque<std::function<void()>> _work;
  bool _isWorking = false;
  bool _isClosing = false;
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
