#pragma once

/// One run of the desktop helper: it is asked one question, answers it or not, and ends.
///
/// Threads: started, waited for and destroyed by one thread; `takeDown` comes from any. Ownership: owns the process, which does
/// not outlive it, and the only socket on which the process can answer. Errors: a helper that cannot be started is none.

#include <sys/types.h>

#include <chrono>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>

#include "Host/Alert/Deadline.h"
#include "Host/Files/FileDescriptor.h"

namespace palisade {

class HelperProcess {
 public:
  using Clock = std::chrono::steady_clock;

  /// Starts `program`, which finds the question on the socket that is its descriptor `helperSocket`. Null, and errno says why,
  /// when that fails. Only the variables of the environment that a window needs are handed on.
  static std::unique_ptr<HelperProcess> start(const std::filesystem::path& program, const std::string& questionFrame);

  HelperProcess(const HelperProcess&) = delete;
  HelperProcess& operator=(const HelperProcess&) = delete;
  ~HelperProcess();

  struct Ending {
    /// What the helper wrote, up to one byte more than an answer.
    std::string received;
    /// None when it was killed from here: taken down, out of time, or still there after its answer.
    std::optional<int> waitStatus = std::nullopt;
  };

  /// Waits until the helper has ended, at most until `deadline`. Called once.
  Ending waitForEnd(Deadline deadline);

  void takeDown() const;

  static constexpr int helperSocket = 3;

 private:
  HelperProcess(pid_t process, FileDescriptor processHandle, FileDescriptor socket, FileDescriptor takenDown)
      : _process(process),
        _processHandle(std::move(processHandle)),
        _socket(std::move(socket)),
        _takenDown(std::move(takenDown)) {}

  bool readAnswer(std::string& received) const;
  int reap();

  pid_t _process;
  FileDescriptor _processHandle;
  FileDescriptor _socket;
  FileDescriptor _takenDown;
};

}  // namespace palisade
