#include "Testing/Worker.h"

#include <utility>

namespace palisade {

Worker::Worker(ThreadLabel label, std::function<void()> work) : _state(std::make_shared<State>()) {
  _state->activity.begin();
  _thread = std::thread([label, work = std::move(work), state = _state]() mutable {
    const ThreadLabelScope scope(label);
    state->activity.runsHere();
    work();
    work = nullptr;
    const std::lock_guard lock(state->mutex);
    state->hasFinished = true;
    state->changed.notify_all();
  });
  _id = _thread.get_id();
}

Worker::~Worker() {
  if (!joinIfFinished()) _thread.detach();
}

bool Worker::hasFinished() const {
  const std::lock_guard lock(_state->mutex);
  return _state->hasFinished;
}

bool Worker::joinIfFinished() {
  if (!hasFinished()) return false;
  if (!_thread.joinable()) return true;
  _thread.join();
  _state->activity.end();
  return true;
}

bool Worker::waitFor(std::chrono::microseconds time) const {
  std::unique_lock lock(_state->mutex);
  return _state->changed.wait_for(lock, time, [this] { return _state->hasFinished; });
}

}  // namespace palisade
