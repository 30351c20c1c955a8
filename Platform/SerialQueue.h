#pragma once

/// Serial queues: work handed to one queue runs one piece at a time, in the order of arrival.
///
/// Threads: asynchronous work runs on a thread of the queue's own, synchronous work there or on the caller's. Both operations
/// may be called from any thread except, for `sync`, from the queue itself. Ownership: a queue runs what it was given before it
/// is destroyed. Errors: an exception that leaves synchronous work reaches the caller of `sync`; asynchronous work must not
/// throw.

#include <functional>
#include <memory>
#include <string>
#include <string_view>

namespace palisade {

class SerialQueue {
 public:
  virtual ~SerialQueue() = default;

  virtual const std::string& label() const = 0;

  virtual void async(std::function<void()> work) = 0;

  /// Returns when `work` has run.
  virtual void sync(const std::function<void()>& work) = 0;
};

class SerialQueueFactory {
 public:
  virtual ~SerialQueueFactory() = default;

  /// Never null. `label` is a reverse-DNS name that shows in logs and debuggers.
  virtual std::shared_ptr<SerialQueue> makeSerialQueue(std::string_view label) = 0;
};

}  // namespace palisade
