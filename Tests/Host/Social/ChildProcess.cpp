#include "Tests/Host/Social/ChildProcess.h"

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <system_error>
#include <utility>

namespace {

[[noreturn]] void become(const std::vector<char*>& words, const std::vector<char*>& environment, int output, int log) {
  prctl(PR_SET_PDEATHSIG, SIGKILL);
  dup2(output, STDOUT_FILENO);
  dup2(log, STDERR_FILENO);
  execve(words.front(), words.data(), environment.data());
  constexpr int cannotExecute = 127;
  _exit(cannotExecute);
}

std::vector<char*> pointers(std::vector<std::string>& texts) {
  std::vector<char*> all;
  for (std::string& text : texts) all.push_back(text.data());
  all.push_back(nullptr);
  return all;
}

}  // namespace

ChildProcess::ChildProcess(const Command& command) {
  std::vector<std::string> words = {command.program.string()};
  words.insert(words.end(), command.arguments.begin(), command.arguments.end());
  std::vector<std::string> variables;
  for (char** variable = environ; *variable != nullptr; ++variable) {
    const std::string text = *variable;
    if (!command.environment.contains(text.substr(0, text.find('=')))) variables.push_back(text);
  }
  for (const auto& [name, value] : command.environment) variables.push_back(name + "=" + value);
  const std::vector<char*> argumentPointers = pointers(words);
  const std::vector<char*> environmentPointers = pointers(variables);

  int ends[2];
  if (pipe2(ends, O_CLOEXEC) != 0) throw std::system_error(errno, std::generic_category(), "pipe");
  const int log = open(command.log.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, S_IRUSR | S_IWUSR);
  _pid = fork();
  if (_pid == 0) become(argumentPointers, environmentPointers, ends[1], log);
  close(ends[1]);
  close(log);
  _output = ends[0];
  if (_pid < 0) throw std::system_error(errno, std::generic_category(), "fork");
}

ChildProcess::~ChildProcess() {
  if (_pid > 0) kill();
  close(_output);
}

std::optional<std::string> ChildProcess::readLine() {
  std::string line;
  char character = 0;
  while (read(_output, &character, 1) == 1) {
    if (character == '\n') return line;
    line += character;
  }
  return line.empty() ? std::nullopt : std::optional(line);
}

void ChildProcess::signal(int number) const { ::kill(_pid, number); }

int ChildProcess::wait() {
  int status = 0;
  while (waitpid(_pid, &status, 0) < 0 && errno == EINTR) {
  }
  _pid = -1;
  return WIFSIGNALED(status) ? -WTERMSIG(status) : WEXITSTATUS(status);
}

void ChildProcess::kill() {
  signal(SIGKILL);
  wait();
}
