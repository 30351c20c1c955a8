#pragma once

/// Serial queues with a thread each. See `SerialQueue`.
///
/// Threads: asynchronous work runs on the queue's thread, which starts with the first of it and is named after the label's last
/// element. Synchronous work that finds nothing before it runs on the caller's thread, which would only wait meanwhile.
/// Ownership: destroying a queue runs what it was given and ends its thread. Errors: none of its own.

#include <condition_variable>
#include <deque>
#include <functional>
#include <mutex>
#include <thread>
#include <utility>

#include "Platform/SerialQueue.h"

namespace palisade {

class ThreadSerialQueue final : public SerialQueue {
 public:
  explicit ThreadSerialQueue(
      std::string_view label, std::function<void()> beforeWaiting = [] {})
      : _label(label),
        _beforeWaiting(std::move(beforeWaiting)) {}
  ~ThreadSerialQueue() override;

  ThreadSerialQueue(const ThreadSerialQueue&) = delete;
  ThreadSerialQueue& operator=(const ThreadSerialQueue&) = delete;

  const std::string& label() const override { return _label; }
  void async(std::function<void()> work) override;
  void sync(const std::function<void()>& work) override;

 private:
  void run();
  bool runAtOnce(const std::function<void()>& work);

  const std::string _label;
  const std::function<void()> _beforeWaiting;
  std::mutex _mutex;
  std::condition_variable _changed;
  std::deque<std::function<void()>> _work;
  bool _isRunning = false;
  bool _isEnding = false;
  std::thread _thread;
};

class ThreadSerialQueueFactory final : public SerialQueueFactory {
 public:
  /// `beforeWaiting` is called on a thread that is about to have synchronous work done: it waits for what stands before it, and
  /// the work takes its time.
  explicit ThreadSerialQueueFactory(std::function<void()> beforeWaiting = [] {}) : _beforeWaiting(std::move(beforeWaiting)) {}

  std::shared_ptr<SerialQueue> makeSerialQueue(std::string_view label) override {
    return std::make_shared<ThreadSerialQueue>(label, _beforeWaiting);
  }

 private:
  const std::function<void()> _beforeWaiting;
};

}  // namespace palisade
