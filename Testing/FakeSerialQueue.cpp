#include "Testing/FakeSerialQueue.h"

#include <atomic>
#include <future>
#include <utility>

namespace palisade {
namespace {

thread_local const FakeSerialQueue* currentQueue = nullptr;

std::atomic<std::uint64_t> givenWork = 0;
std::atomic<std::uint64_t> doneWork = 0;

}  // namespace

FakeSerialQueue::FakeSerialQueue(Instruments instruments, std::string_view label)
    : _instruments(instruments),
      _label(label),
      _thread([this] { run(); }) {}

FakeSerialQueue::~FakeSerialQueue() {
  {
    const std::lock_guard lock(_mutex);
    _isClosing = true;
  }
  _changed.notify_all();
  _thread.join();
}

FakeSerialQueue::Work FakeSerialQueue::workInProcess() {
  // In this order, work that is given and done between the two looks makes a difference instead of an accidental balance.
  const std::uint64_t done = doneWork;
  return {.given = givenWork, .done = done};
}

std::optional<std::string> FakeSerialQueue::labelOfCurrent() {
  return currentQueue == nullptr ? std::nullopt : std::optional(currentQueue->_label);
}

const std::string& FakeSerialQueue::label() const {
  _instruments.faults.enter("SerialQueue.label");
  return _label;
}

void FakeSerialQueue::async(std::function<void()> work) {
  _instruments.faults.enter("SerialQueue.async");
  push(std::move(work));
}

void FakeSerialQueue::sync(const std::function<void()>& work) {
  _instruments.faults.enter("SerialQueue.sync");
  std::packaged_task<void()> task([&] {
    _instruments.faults.enter("SerialQueue.work");
    work();
  });
  std::future<void> done = task.get_future();
  push([&task] { task(); });
  done.get();
}

void FakeSerialQueue::drain() {
  std::unique_lock lock(_mutex);
  _changed.wait(lock, [this] { return _work.empty() && !_isWorking; });
}

void FakeSerialQueue::push(std::function<void()> work) {
  ++givenWork;
  {
    const std::lock_guard lock(_mutex);
    _work.push_back(std::move(work));
  }
  _changed.notify_all();
}

void FakeSerialQueue::run() {
  const ThreadLabelScope label(ThreadLabel::preferences);
  currentQueue = this;
  std::unique_lock lock(_mutex);
  for (;;) {
    _changed.wait(lock, [this] { return _isClosing || !_work.empty(); });
    if (_work.empty()) return;
    std::function<void()> work = std::move(_work.front());
    _work.pop_front();
    _isWorking = true;
    lock.unlock();
    work();
    work = nullptr;
    lock.lock();
    _isWorking = false;
    _changed.notify_all();
    ++doneWork;
  }
}

std::shared_ptr<SerialQueue> FakeSerialQueueFactory::makeSerialQueue(std::string_view label) {
  _instruments.faults.enter("Queue.create");
  _instruments.trace.record("Queue.create", {{"label", label}, {"serial", true}});
  auto queue = std::make_shared<FakeSerialQueue>(_instruments, label);
  const std::lock_guard lock(_mutex);
  _queues.push_back(queue);
  return queue;
}

void FakeSerialQueueFactory::drain() {
  std::vector<std::weak_ptr<FakeSerialQueue>> queues;
  {
    const std::lock_guard lock(_mutex);
    queues = _queues;
  }
  for (const auto& each : queues) {
    if (const auto queue = each.lock()) queue->drain();
  }
}

}  // namespace palisade
