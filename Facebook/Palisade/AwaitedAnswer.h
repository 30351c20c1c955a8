#pragma once

/// A server's answer that one thread waits for while another one brings it.
///
/// Threads: one thread waits; `bring` and `fail` are called by the thread on which the answer arrives. Ownership: shared by the
/// callbacks that may bring the answer, and by nobody else: when the last of them goes away without it, the wait ends all the
/// same. Errors: waiting throws what `fail` was given, or that the callback was dropped. Only making one needs memory.

#include <future>
#include <utility>

#include "Facebook/Palisade/ExactlyOnce.h"

namespace palisade {

template <typename Answer>
class AwaitedAnswer {
 public:
  AwaitedAnswer() = default;
  AwaitedAnswer(const AwaitedAnswer&) = delete;
  AwaitedAnswer& operator=(const AwaitedAnswer&) = delete;

  // A promise that is destroyed without a value makes an error of its own, for which there may be no memory.
  ~AwaitedAnswer() { fail(droppedCallback()); }

  /// Asked for once, before the answer can come.
  std::future<Answer> future() { return _promise.get_future(); }

  /// The first of these calls counts.
  void bring(Answer answer) {
    if (!std::exchange(_isThere, true)) _promise.set_value(std::move(answer));
  }
  void fail(const std::exception_ptr& failure) {
    if (!std::exchange(_isThere, true)) _promise.set_exception(failure);
  }

 private:
  std::promise<Answer> _promise;
  bool _isThere = false;
};

}  // namespace palisade
