#include "Benchmarks/Daemon/StandingRequests.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <initializer_list>
#include <string>
#include <vector>

#include "Benchmarks/Daemon/AccountsCalls.h"
#include "Benchmarks/Daemon/BusLoad.h"

namespace palisade {
namespace {

// Starts a program along PATH, with its standard output at `output`.
pid_t start(std::vector<std::string> words, int output) {
  std::vector<char*> arguments;
  for (std::string& word : words) arguments.push_back(word.data());
  arguments.push_back(nullptr);
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_adddup2(&actions, output, STDOUT_FILENO);
  pid_t process = -1;
  const int error = posix_spawnp(&process, arguments.front(), &actions, nullptr, arguments.data(), environ);
  posix_spawn_file_actions_destroy(&actions);
  if (error != 0) throw BusCallError(words.front() + ": " + std::strerror(error));
  return process;
}

void waitForEnd(pid_t process) {
  while (waitpid(process, nullptr, 0) < 0 && errno == EINTR) {
  }
}

void tellSandbox(std::initializer_list<std::string> words) {
  std::vector<std::string> command{"palisade-sandbox"};
  command.insert(command.end(), words);
  waitForEnd(start(command, STDERR_FILENO));
}

}  // namespace

StandingRequests::StandingRequests(int count) {
  tellSandbox({"fault", "silent", "--times", "0", "--path", "/oauth/permission-description"});
  int ends[2];
  requireSuccess(-(pipe2(ends, O_CLOEXEC) == 0 ? 0 : errno), "No pipe");
  _application = start({"palisade-daemon-benchmark", "stand", std::to_string(count)}, ends[1]);
  close(ends[1]);
  FILE* const output = fdopen(ends[0], "r");
  const bool stands = std::fscanf(output, "%d", &_standing) == 1;
  std::fclose(output);
  if (!stands || _standing == 0) throw BusCallError("No request of the other application stands.");
}

StandingRequests::~StandingRequests() {
  kill(_application, SIGKILL);
  waitForEnd(_application);
  tellSandbox({"calm"});
}

void standAtServer(int count) {
  const Bus bus = openBus();
  std::printf("%d\n", requestWithoutWaiting(*bus, count));
  std::fflush(stdout);
  while (true) pause();
}

}  // namespace palisade
