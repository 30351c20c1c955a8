#pragma once

/// A session bus of a test's own, on which a real keyring daemon can be started, locked, frozen and killed. Home and runtime
/// folders are the test's own too; the environment of the test process points to all of it.
///
/// Nothing is activated on this bus: a service that was not started is missing. Threads: one. Ownership: destroying it ends
/// what it started and removes the folders.

#include <sys/types.h>

#include <filesystem>
#include <string>
#include <vector>

#include "Tests/Host/TemporaryFolder.h"

namespace palisade {

class PrivateSession {
 public:
  PrivateSession();
  PrivateSession(const PrivateSession&) = delete;
  PrivateSession& operator=(const PrivateSession&) = delete;
  ~PrivateSession();

  const std::filesystem::path& home() const { return _folder.path(); }

  /// Starts the keyring daemon with an unlocked default keyring, which is made the first time.
  void startKeyring();
  /// Starts it as a session does in which nobody has given a password: locked, or without any keyring.
  void startKeyringWithoutPassword();
  void lockKeyring();
  void killKeyring();
  /// A frozen daemon keeps its name on the bus and answers nothing.
  void freezeKeyring();
  void thawKeyring();

  /// Ends the bus itself, and everybody's connection with it.
  void endBus();

  /// Runs a program to its end and answers what it printed.
  std::string run(const std::vector<std::string>& command);

  /// Starts a program that ends with the session. Returns when `name` is on the bus.
  void startService(const std::vector<std::string>& command, const std::string& name);
  /// Starts to record what crosses the bus; `recording` says what has until now.
  void record();
  std::string recording() const;

 private:
  pid_t spawn(const std::vector<std::string>& command, const std::string& input, const std::filesystem::path& output);
  void startKeyring(const std::vector<std::string>& options, const std::string& input);
  void waitForName(const std::string& name, bool isThere);
  void waitForAnswer(const std::vector<std::string>& command, const std::string& answer);
  void end(pid_t process);

  TemporaryFolder _folder;
  std::vector<pid_t> _processes;
  pid_t _bus = -1;
  pid_t _keyring = -1;
};

}  // namespace palisade
