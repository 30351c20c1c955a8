#include "Testing/FakeSerialQueue.h"

#include <future>
#include <utility>

// An activity is begun before the queue's mutex is touched from outside: whoever has to wait for that mutex then waits for a
// thread that is known to be busy.

namespace palisade {
namespace {

thread_local const FakeSerialQueue* currentQueue = nullptr;

}  // namespace

FakeSerialQueue::FakeSerialQueue(Instruments instruments, std::string_view label) : _instruments(instruments), _label(label) {
  _activity.begin();
  _thread = std::thread([this] { run(); });
}

FakeSerialQueue::~FakeSerialQueue() {
  _activity.begin();
  {
    const std::lock_guard lock(_mutex);
    _isClosing = true;
  }
  _changed.notify_all();
  _thread.join();
  _activity.end();
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
  _activity.begin();
  {
    std::unique_lock lock(_mutex);
    _changed.wait(lock, [this] { return _unfinished == 0; });
  }
  _activity.end();
}

void FakeSerialQueue::push(std::function<void()> work) {
  _activity.begin();
  {
    const std::lock_guard lock(_mutex);
    _work.push_back(std::move(work));
    ++_unfinished;
  }
  _changed.notify_all();
}

std::optional<std::function<void()>> FakeSerialQueue::next() {
  std::unique_lock lock(_mutex);
  _changed.wait(lock, [this] { return _isClosing || !_work.empty(); });
  if (_work.empty()) return std::nullopt;
  std::function<void()> work = std::move(_work.front());
  _work.pop_front();
  return work;
}

void FakeSerialQueue::finishOne() {
  const std::lock_guard lock(_mutex);
  --_unfinished;
  _changed.notify_all();
}

void FakeSerialQueue::run() {
  const ThreadLabelScope label(ThreadLabel::preferences);
  currentQueue = this;
  _activity.runsHere();
  _activity.end();
  while (auto work = next()) {
    (*work)();
    work.reset();
    finishOne();
    _activity.end();
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
