#pragma once

/// Runs calls that may wait, away from the thread that reads the bus, with a bound on how many threads wait.
///
/// Of the calls of one line a few run at once, on a thread each; the others stand in the line without one. Whose calls share a
/// line is up to the caller: an application that has filled its own delays nobody else's.
/// Threads: `run` from any thread; a call runs on the calling thread, or on that of a call before it. Ownership: owns what
/// waits. Errors: `BusFailure` for a call that finds its line full, or no thread to run on.

#include <cstddef>
#include <deque>
#include <functional>
#include <limits>
#include <map>
#include <mutex>
#include <string>

namespace palisade {

class WaitingCalls {
 public:
  static constexpr std::size_t unbounded = std::numeric_limits<std::size_t>::max();

  /// `atOnce` of a line's calls run at a time, and begin in order; `mostInLine` may wait for their turn.
  WaitingCalls(std::size_t atOnce, std::size_t mostInLine) : _atOnce(atOnce), _mostInLine(mostInLine) {}

  /// Runs `call` now or later. It must not throw.
  void run(const std::string& line, std::function<void()> call);

 private:
  struct Line {
    std::size_t running = 0;
    std::deque<std::function<void()>> waiting = {};
  };

  std::function<void()> nextOf(const std::string& line);

  const std::size_t _atOnce;
  const std::size_t _mostInLine;
  std::mutex _mutex;
  std::map<std::string, Line> _lines;
  /// In all lines; now, and at most since there last was none.
  std::size_t _waiting = 0;
  std::size_t _mostWaiting = 0;
};

}  // namespace palisade
