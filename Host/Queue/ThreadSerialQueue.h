#pragma once

/// Serial queues with a thread each. See `SerialQueue`.
///
/// Threads: the queue's thread starts with its first work, so a queue that is never used costs none; it is named after the
/// label's last element. Ownership: destroying a queue runs what it was given and ends its thread. Errors: none of its own.

#include <condition_variable>
#include <deque>
#include <mutex>
#include <thread>

#include "Platform/SerialQueue.h"

namespace palisade {

class ThreadSerialQueue final : public SerialQueue {
 public:
  explicit ThreadSerialQueue(std::string_view label) : _label(label) {}
  ~ThreadSerialQueue() override;

  ThreadSerialQueue(const ThreadSerialQueue&) = delete;
  ThreadSerialQueue& operator=(const ThreadSerialQueue&) = delete;

  const std::string& label() const override { return _label; }
  void async(std::function<void()> work) override;
  void sync(const std::function<void()>& work) override;

 private:
  void run();

  const std::string _label;
  std::mutex _mutex;
  std::condition_variable _hasWork;
  std::deque<std::function<void()>> _work;
  bool _isEnding = false;
  std::thread _thread;
};

class ThreadSerialQueueFactory final : public SerialQueueFactory {
 public:
  std::shared_ptr<SerialQueue> makeSerialQueue(std::string_view label) override {
    return std::make_shared<ThreadSerialQueue>(label);
  }
};

}  // namespace palisade
