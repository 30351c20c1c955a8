#pragma once

/// Answers given one after the other; the last one repeats.
///
/// Threads: safe from every thread. Errors: an empty script answers a value-initialised `Answer`.

#include <algorithm>
#include <cstddef>
#include <initializer_list>
#include <mutex>
#include <utility>
#include <vector>

namespace palisade {

template <typename Answer>
class Script {
 public:
  /// Starts over with these answers.
  void set(std::vector<Answer> answers) {
    const std::lock_guard lock(_mutex);
    _answers = std::move(answers);
    _next = 0;
  }

  Script& operator=(std::initializer_list<Answer> answers) {
    set(answers);
    return *this;
  }

  Answer next() {
    const std::lock_guard lock(_mutex);
    if (_answers.empty()) return Answer{};
    return _answers[std::min(_next++, _answers.size() - 1)];
  }

 private:
  std::mutex _mutex;
  std::vector<Answer> _answers;
  std::size_t _next = 0;
};

}  // namespace palisade
