// Identifies callers from another user's account, and from a PID namespace of its own.
//
//     identity-trial identify PID    prints the caller's ID, or "refused: " and why
//     identity-trial folder PATH     prints why a folder is none of the system's
//     identity-trial reuse COUNT     as the first process of a PID namespace: replaces a caller by another process of the same
//                                    number while it is being identified; prints how often that came about, and how often the
//                                    caller was refused

#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <cstdlib>
#include <fstream>
#include <iostream>
#include <string_view>

#include "Host/Identity/SystemFolder.h"
#include "Tests/Host/Identity/Identify.h"

namespace {

int tell(pid_t process) {
  const palisade::ClientRegistry registry({});
  try {
    std::cout << identify(registry, process)->id() << '\n';
  } catch (const palisade::IdentityError& error) {
    std::cout << "refused: " << error.what() << '\n';
  }
  return 0;
}

pid_t startProcess() {
  const pid_t process = fork();
  while (process == 0) pause();
  return process;
}

void end(pid_t process) {
  kill(process, SIGKILL);
  waitpid(process, nullptr, 0);
}

int reuse(int count) {
  const palisade::ClientRegistry registry({});
  int reused = 0;
  int refused = 0;
  for (int turn = 0; turn < count; ++turn) {
    const pid_t caller = startProcess();
    pid_t successor = -1;
    const auto processOfConnection = [&] {
      end(caller);
      // The kernel gives out the next number after the last one.
      std::ofstream("/proc/sys/kernel/ns_last_pid") << caller - 1;
      successor = startProcess();
      return caller;
    };
    try {
      identify(registry, caller, processOfConnection);
    } catch (const palisade::IdentityError&) {
      ++refused;
    }
    if (successor == caller) ++reused;
    end(successor);
  }
  std::cout << "reused " << reused << ", refused " << refused << '\n';
  return 0;
}

}  // namespace

int main(int count, char** words) {
  if (count != 3) return 2;
  const std::string_view what = words[1];
  if (what == "folder") {
    std::cout << palisade::SystemFolder(words[2]).trouble().value_or("the system's") << '\n';
    return 0;
  }
  const int number = std::atoi(words[2]);
  if (what == "identify") return tell(number);
  return what == "reuse" ? reuse(number) : 2;
}
