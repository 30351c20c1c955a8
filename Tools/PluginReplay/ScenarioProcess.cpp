// The child writes two lines of JSON into a pipe: the scenario's ID, then the result. What is missing at the end tells the
// parent how far it came. The child leaves without ceremony, because operations that wait for ever still hold their threads.
// The parent waits for the whole process before it notes the end: a parent that asks while threads are still being taken down
// spends more time in the kernel than the scenario took.

#include "Tools/PluginReplay/ScenarioProcess.h"

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <string_view>
#include <system_error>
#include <utility>

#include <fcntl.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

// The header of glibc 2.36 leaves the language of its functions open.
extern "C" {
#include <sys/pidfd.h>
}

#include "Host/Json/Json.h"
#include "Tools/PluginReplay/TraceWriter.h"

namespace palisade {
namespace {

std::system_error failure(const char* what) { return {errno, std::generic_category(), what}; }

void writeLine(int descriptor, std::string line) {
  line += '\n';
  std::string_view rest = line;
  while (!rest.empty()) {
    const ssize_t written = write(descriptor, rest.data(), rest.size());
    if (written < 0 && errno != EINTR) _exit(EXIT_FAILURE);
    if (written > 0) rest.remove_prefix(static_cast<std::size_t>(written));
  }
}

// The input belongs to the parent, and so does the output: what a plug-in prints goes to the error output.
void leaveStandardStreamsToTheParent() {
  const int nothing = open("/dev/null", O_RDONLY);
  if (nothing >= 0) dup2(nothing, STDIN_FILENO);
  dup2(STDERR_FILENO, STDOUT_FILENO);
}

[[noreturn]] void runChild(int descriptor, const std::string& text, const CarryOut& carryOut) {
  prctl(PR_SET_PDEATHSIG, SIGKILL);
  leaveStandardStreamsToTheParent();
  const ScenarioResult result = carryOut(text, [descriptor](const std::optional<std::string>& scenarioID) {
    writeLine(descriptor, writeJson(scenarioID ? Value(*scenarioID) : Value()));
  });
  writeLine(descriptor, result.line);
  _exit(result.outcome == ScenarioOutcome::malformed ? EXIT_FAILURE : EXIT_SUCCESS);
}

std::optional<std::string> announcedID(std::string_view line) {
  const auto value = NlohmannJsonParser().parse(line, JsonFragments::allowed).value;
  return value && value->string() != nullptr ? std::optional(*value->string()) : std::nullopt;
}

}  // namespace

ScenarioProcess::ScenarioProcess(const std::string& text, const CarryOut& carryOut) {
  std::array<int, 2> ends{};
  if (pipe2(ends.data(), O_CLOEXEC) != 0) throw failure("cannot make a pipe for a scenario");
  const pid_t child = fork();
  if (child == 0) runChild(ends[1], text, carryOut);
  close(ends[1]);
  _output = ends[0];
  if (child > 0) _process = pidfd_open(child, 0);
  if (_process >= 0) return;
  const int reason = errno;
  close(_output);
  errno = reason;
  throw failure("cannot start a process for a scenario");
}

ScenarioProcess::~ScenarioProcess() {
  if (_output >= 0) close(_output);
  if (_process < 0) return;
  pidfd_send_signal(_process, SIGKILL, nullptr, 0);
  noteEnd();
}

void ScenarioProcess::advance() {
  if (_output >= 0) {
    readOutput();
  } else {
    noteEnd();
  }
}

void ScenarioProcess::readOutput() {
  std::array<char, 65536> buffer;
  const ssize_t length = read(_output, buffer.data(), buffer.size());
  if (length > 0) {
    _text.append(buffer.data(), static_cast<std::size_t>(length));
  } else if (length == 0 || errno != EINTR) {
    close(std::exchange(_output, -1));
  }
}

void ScenarioProcess::noteEnd() {
  siginfo_t end{};
  while (waitid(P_PIDFD, static_cast<id_t>(_process), &end, WEXITED) != 0 && errno == EINTR) continue;
  close(std::exchange(_process, -1));

  const std::size_t endOfID = _text.find('\n');
  const auto id = announcedID(std::string_view(_text).substr(0, endOfID));
  const bool isComplete = endOfID != std::string::npos && _text.size() > endOfID + 1 && _text.back() == '\n';
  if (end.si_code != CLD_EXITED) {
    _result = {.line = writeCrash(id, end.si_status), .outcome = ScenarioOutcome::crashed};
  } else if (isComplete) {
    _result = {.line = _text.substr(endOfID + 1, _text.size() - endOfID - 2),
               .outcome = end.si_status == EXIT_SUCCESS ? ScenarioOutcome::carriedOut : ScenarioOutcome::malformed};
  } else {
    const std::string problem = "the plug-in ended the process with exit status " + std::to_string(end.si_status);
    _result = {.line = writeScenarioError(id, problem), .outcome = ScenarioOutcome::crashed};
  }
  _text.clear();
}

}  // namespace palisade
