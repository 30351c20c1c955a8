#include "Tests/Host/Identity/CallerProcess.h"

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/socket.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <csignal>
#include <cstdio>
#include <cstring>
#include <stdexcept>

namespace {

pid_t start(std::vector<std::string>& words, const std::string& firstWord, int input, int output) {
  const std::string program = words.front();
  if (!firstWord.empty()) words.front() = firstWord;
  std::vector<char*> pointers;
  for (std::string& word : words) pointers.push_back(word.data());
  pointers.push_back(nullptr);
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_adddup2(&actions, input, STDIN_FILENO);
  posix_spawn_file_actions_adddup2(&actions, output, STDOUT_FILENO);
  pid_t process = -1;
  const int error = posix_spawnp(&process, program.c_str(), &actions, nullptr, pointers.data(), environ);
  posix_spawn_file_actions_destroy(&actions);
  if (error != 0) throw std::runtime_error(program + ": " + std::strerror(error));
  return process;
}

// Waits for a message on the socket; the kernel adds who wrote it, as this process's namespace numbers it.
pid_t writerOfMessage(int socket) {
  std::array<char, 64> text{};
  alignas(cmsghdr) std::array<char, CMSG_SPACE(sizeof(ucred))> control{};
  iovec content{.iov_base = text.data(), .iov_len = text.size()};
  msghdr message{};
  message.msg_iov = &content;
  message.msg_iovlen = 1;
  message.msg_control = control.data();
  message.msg_controllen = control.size();
  if (recvmsg(socket, &message, 0) <= 0) throw std::runtime_error("The caller ended before it came up.");
  const cmsghdr* header = CMSG_FIRSTHDR(&message);
  if (header == nullptr) throw std::runtime_error("The caller does not say which process it is.");
  ucred writer{};
  std::memcpy(&writer, CMSG_DATA(header), sizeof(writer));
  return writer.pid;
}

}  // namespace

CallerProcess::CallerProcess(std::vector<std::string> words, const std::string& firstWord) {
  std::array<int, 2> input{};
  std::array<int, 2> output{};
  const int isOn = 1;
  if (pipe2(input.data(), O_CLOEXEC) != 0 || socketpair(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0, output.data()) != 0 ||
      setsockopt(output[0], SOL_SOCKET, SO_PASSCRED, &isOn, sizeof(isOn)) != 0) {
    throw std::runtime_error(std::strerror(errno));
  }
  _lifeline = input[1];
  _started = start(words, firstWord, input[0], output[1]);
  close(input[0]);
  close(output[1]);
  _caller = writerOfMessage(output[0]);
  _pin = static_cast<int>(syscall(SYS_pidfd_open, _caller, 0));
  close(output[0]);
}

CallerProcess::~CallerProcess() { wait(); }

void CallerProcess::kill() const {
  ::kill(_caller, SIGKILL);
  siginfo_t ignored{};
  while (waitid(P_PID, static_cast<id_t>(_caller), &ignored, WEXITED | WNOWAIT) < 0 && errno == EINTR) {
  }
}

void CallerProcess::wait() {
  if (_started < 0) return;
  ::kill(_caller, SIGKILL);
  ::kill(_started, SIGKILL);
  close(_lifeline);
  while (waitpid(_started, nullptr, 0) < 0 && errno == EINTR) {
  }
  _started = -1;
  // A sandbox that is gone says nothing about the program in it, which may still be on its way out.
  pollfd end{.fd = _pin, .events = POLLIN, .revents = 0};
  while (poll(&end, 1, -1) < 0 && errno == EINTR) {
  }
  close(_pin);
}

std::string outputOf(const std::string& command) {
  std::string output;
  FILE* pipe = popen((command + " 2>&1").c_str(), "r");
  if (pipe == nullptr) return output;
  std::array<char, 4096> buffer{};
  for (std::size_t count = 0; (count = fread(buffer.data(), 1, buffer.size(), pipe)) > 0;) output.append(buffer.data(), count);
  pclose(pipe);
  return output;
}
