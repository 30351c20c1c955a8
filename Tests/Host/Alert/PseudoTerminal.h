#pragma once

/// A terminal that nobody sits at.

#include <fcntl.h>
#include <stdlib.h>
#include <unistd.h>

#include <string>

class PseudoTerminal {
 public:
  PseudoTerminal() : _screen(posix_openpt(O_RDWR | O_NOCTTY | O_CLOEXEC)) {
    if (grantpt(_screen) == 0 && unlockpt(_screen) == 0) _path = ptsname(_screen);
  }
  PseudoTerminal(const PseudoTerminal&) = delete;
  PseudoTerminal& operator=(const PseudoTerminal&) = delete;
  ~PseudoTerminal() { close(_screen); }

  const std::string& path() const { return _path; }

 private:
  int _screen;
  std::string _path;
};
