#pragma once

/// A copy of the test process that does one piece of work, says how far it has come, and may be killed at any moment.
///
/// Threads: forked while the test has one thread. Ownership: destroying it kills the process and waits for its end.

#include <sys/types.h>

#include <functional>

namespace palisade {

class ChildProcess {
 public:
  /// Says that one more piece is done. What is said survives the process.
  using Acknowledge = std::function<void()>;

  /// The child runs `work` and ends with 0, or with 1 when it throws.
  explicit ChildProcess(const std::function<void(const Acknowledge&)>& work);
  ChildProcess(const ChildProcess&) = delete;
  ChildProcess& operator=(const ChildProcess&) = delete;
  ~ChildProcess();

  /// Waits until the child has said so many times that a piece is done, or has ended.
  void waitForAcknowledgements(int count);

  void kill();

  struct End {
    int acknowledgements = 0;
    bool wasKilled = false;
    int exitStatus = 0;
  };
  /// Waits for the end of the child.
  End wait();

 private:
  bool readAcknowledgement();

  pid_t _process = -1;
  int _pipe = -1;
  int _acknowledgements = 0;
};

}  // namespace palisade
