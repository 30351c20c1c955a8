#pragma once

/// A terminal that nobody sits at, and that shows nothing to anybody: what is written there is thrown away as it comes.

#include <fcntl.h>
#include <poll.h>
#include <stdlib.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <string>
#include <string_view>
#include <thread>

class PseudoTerminal {
 public:
  PseudoTerminal() : _screen(posix_openpt(O_RDWR | O_NOCTTY | O_CLOEXEC)) {
    if (grantpt(_screen) == 0 && unlockpt(_screen) == 0) _path = ptsname(_screen);
    // A terminal that nobody has open has hung up.
    _terminal = open(_path.c_str(), O_RDWR | O_NOCTTY | O_CLOEXEC);
    _reader = std::thread([this] { throwAway(); });
  }
  PseudoTerminal(const PseudoTerminal&) = delete;
  PseudoTerminal& operator=(const PseudoTerminal&) = delete;
  ~PseudoTerminal() {
    eventfd_write(_left, 1);
    _reader.join();
    close(_left);
    close(_terminal);
    close(_screen);
  }

  const std::string& path() const { return _path; }

  /// Types at its keyboard.
  bool type(std::string_view keys) const {
    return write(_screen, keys.data(), keys.size()) == static_cast<ssize_t>(keys.size());
  }

 private:
  void throwAway() const {
    char bytes[4096];
    while (true) {
      pollfd sources[] = {{.fd = _left, .events = POLLIN, .revents = 0}, {.fd = _screen, .events = POLLIN, .revents = 0}};
      if (poll(sources, 2, -1) < 0 || sources[0].revents != 0 || read(_screen, bytes, sizeof bytes) < 0) return;
    }
  }

  int _screen;
  int _terminal = -1;
  int _left = eventfd(0, EFD_CLOEXEC);
  std::string _path;
  std::thread _reader;
};
