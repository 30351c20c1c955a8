#pragma once

/// A real process that calls. It ends with the test, whatever happens to the test.
///
/// Threads: those of the test, one at a time. Errors: `std::runtime_error` when it does not come up.

#include <sys/types.h>

#include <string>
#include <vector>

class CallerProcess {
 public:
  /// Starts a command and waits until a program in it says on its standard output that it runs. The program sees `firstWord` as
  /// its own name, if there is one.
  explicit CallerProcess(std::vector<std::string> words, const std::string& firstWord = {});
  CallerProcess(const CallerProcess&) = delete;
  CallerProcess& operator=(const CallerProcess&) = delete;
  ~CallerProcess();

  /// The number of the process that said so, as this process's namespace knows it.
  pid_t pid() const { return _caller; }

  /// Kills a program that was started directly, and leaves it unburied: its number stays taken.
  void kill() const;

  /// Waits until it has ended and its number is free.
  void wait();

 private:
  pid_t _started = -1;
  pid_t _caller = -1;
  int _pin = -1;
  int _lifeline = -1;
};

/// What a command writes to its standard output and its standard error.
std::string outputOf(const std::string& command);
