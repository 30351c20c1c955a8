#pragma once

/// Hears that the user's session is being locked: from the session's screen saver, and from the login manager. Nobody
/// else is believed.
///
/// Threads: made and destroyed by one thread; `onLock` comes from a thread of its own until the destructor returns. Ownership:
/// owns its connections. Errors: a bus that cannot be reached is not listened to, nor is one that has gone; without any, the
/// constructor throws `std::runtime_error`.

#include <functional>
#include <memory>
#include <vector>

namespace palisade {

class SessionLock {
 public:
  explicit SessionLock(std::function<void()> onLock);
  SessionLock(const SessionLock&) = delete;
  SessionLock& operator=(const SessionLock&) = delete;
  ~SessionLock();

 private:
  class Listener;

  void listenToScreenSaver();
  void listenToLogins();

  std::function<void()> _onLock;
  std::vector<std::unique_ptr<Listener>> _listeners;
};

}  // namespace palisade
