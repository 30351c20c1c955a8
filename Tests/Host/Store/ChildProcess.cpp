#include "Tests/Host/Store/ChildProcess.h"

#include <fcntl.h>
#include <signal.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstdio>
#include <exception>
#include <system_error>

namespace palisade {

ChildProcess::ChildProcess(const std::function<void(const Acknowledge&)>& work) {
  int ends[2];
  if (::pipe2(ends, O_CLOEXEC) != 0) throw std::system_error(errno, std::generic_category(), "pipe");
  _process = ::fork();
  if (_process < 0) throw std::system_error(errno, std::generic_category(), "fork");
  if (_process == 0) {
    ::close(ends[0]);
    try {
      work([&] { ::syscall(SYS_write, ends[1], "a", 1); });
      ::_exit(0);
    } catch (const std::exception& error) {
      std::fprintf(stderr, "the child failed: %s\n", error.what());
      ::_exit(1);
    }
  }
  ::close(ends[1]);
  _pipe = ends[0];
}

ChildProcess::~ChildProcess() {
  if (_process > 0) {
    kill();
    wait();
  }
}

bool ChildProcess::readAcknowledgement() {
  char byte = 0;
  ssize_t size = 0;
  do {
    size = ::read(_pipe, &byte, 1);
  } while (size < 0 && errno == EINTR);
  if (size != 1) return false;
  ++_acknowledgements;
  return true;
}

void ChildProcess::waitForAcknowledgements(int count) {
  while (_acknowledgements < count && readAcknowledgement()) {
  }
}

void ChildProcess::kill() { ::kill(_process, SIGKILL); }

ChildProcess::End ChildProcess::wait() {
  while (readAcknowledgement()) {
  }
  ::close(_pipe);
  int status = 0;
  while (::waitpid(_process, &status, 0) < 0 && errno == EINTR) {
  }
  _process = -1;
  return {.acknowledgements = _acknowledgements,
          .wasKilled = WIFSIGNALED(status) && WTERMSIG(status) == SIGKILL,
          .exitStatus = WIFEXITED(status) ? WEXITSTATUS(status) : -1};
}

}  // namespace palisade
