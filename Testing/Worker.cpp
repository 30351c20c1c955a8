#include "Testing/Worker.h"

#include <utility>

#include <unistd.h>

#include "Testing/EndlessWait.h"

namespace palisade {

Worker::Worker(ThreadLabel label, std::function<void()> work)
    : _state(std::make_shared<State>()),
      _thread([label, work = std::move(work), state = _state]() mutable {
        const ThreadLabelScope scope(label);
        {
          const std::lock_guard lock(state->mutex);
          state->thread = gettid();
        }
        work();
        work = nullptr;
        const std::lock_guard lock(state->mutex);
        state->hasFinished = true;
        state->changed.notify_all();
      }),
      _id(_thread.get_id()) {}

Worker::~Worker() {
  if (hasFinished()) {
    _thread.join();
  } else {
    _thread.detach();
  }
}

bool Worker::hasFinished() const {
  const std::lock_guard lock(_state->mutex);
  return _state->hasFinished;
}

bool Worker::waitFor(std::chrono::microseconds time) const {
  std::unique_lock lock(_state->mutex);
  return _state->changed.wait_for(lock, time, [this] { return _state->hasFinished; });
}

std::optional<std::string> Worker::endlessWait() const {
  pid_t thread = 0;
  {
    const std::lock_guard lock(_state->mutex);
    if (_state->thread == 0 || _state->hasFinished) return std::nullopt;
    thread = _state->thread;
  }
  return endlessWaitOf(thread);
}

}  // namespace palisade
