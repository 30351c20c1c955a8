#pragma once

/// A real process that a test starts. It ends with the test, whatever happens to the test.
///
/// Threads: those of the test, one at a time. Errors: `std::system_error` when it cannot be started.

#include <sys/types.h>

#include <filesystem>
#include <map>
#include <optional>
#include <string>
#include <vector>

class ChildProcess {
 public:
  struct Command {
    std::filesystem::path program;
    std::vector<std::string> arguments = {};
    /// Set beside what the test's own environment holds.
    std::map<std::string, std::string> environment = {};
    /// Takes what it writes to its standard error, after what is there.
    std::filesystem::path log = "/dev/null";
  };

  explicit ChildProcess(const Command& command);
  ChildProcess(const ChildProcess&) = delete;
  ChildProcess& operator=(const ChildProcess&) = delete;
  ~ChildProcess();

  pid_t pid() const { return _pid; }

  /// The next line of its standard output; none when that has ended.
  std::optional<std::string> readLine();

  void signal(int number) const;

  /// Waits for its end: the exit status, or minus the signal that ended it.
  int wait();

  /// SIGKILL, and waits.
  void kill();

 private:
  pid_t _pid = -1;
  int _output = -1;
};
