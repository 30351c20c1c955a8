#include "Host/Alert/TerminalAlert.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/eventfd.h>
#include <sys/ioctl.h>
#include <termios.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <initializer_list>
#include <span>
#include <string_view>
#include <utility>

#include "Host/Alert/AlertFocus.h"
#include "Host/Alert/AskedQuestion.h"
#include "Host/Alert/Deadline.h"
#include "Host/Alert/TerminalDialog.h"
#include "Host/Files/FileDescriptor.h"

namespace palisade {
namespace {

using Clock = std::chrono::steady_clock;

FileDescriptor openTerminal(const std::string& path) {
  FileDescriptor terminal(open(path.c_str(), O_RDWR | O_CLOEXEC | O_NOCTTY));
  if (terminal.isOpen() && isatty(terminal.number()) != 1) return FileDescriptor(-1);
  return terminal;
}

std::size_t columnsOfTerminal(int terminal) {
  winsize size{};
  return ioctl(terminal, TIOCGWINSZ, &size) == 0 && size.ws_col > 0 ? size.ws_col : 80;
}

void writeAll(int descriptor, std::string_view text) {
  while (!text.empty()) {
    const ssize_t written = write(descriptor, text.data(), text.size());
    if (written < 0 && errno != EINTR) return;
    if (written > 0) text.remove_prefix(static_cast<std::size_t>(written));
  }
}

// Takes the first key off `input`, which is not empty: an escape sequence (ECMA-48), a key with Alt, which sends an Escape
// before it, or a byte. One read may bring several.
std::string_view takeKey(std::string_view& input) {
  std::size_t length = 1;
  if (input.starts_with("\x1bO")) {
    length = std::min<std::size_t>(input.size(), 3);
  } else if (input.starts_with("\x1b[")) {
    length = 2;
    while (length < input.size() && (input[length] < '@' || input[length] > '~')) ++length;
    length = std::min(input.size(), length + 1);
  } else if (input.starts_with('\x1b')) {
    length = std::min<std::size_t>(input.size(), 2);
  }
  const std::string_view key = input.substr(0, length);
  input.remove_prefix(length);
  return key;
}

bool isOneOf(std::string_view key, std::initializer_list<std::string_view> keys) { return std::ranges::count(keys, key) > 0; }

class TerminalAlertHandle final : public AlertHandle {
 public:
  TerminalAlertHandle(FileDescriptor terminal, FileDescriptor takenDown, AlertQuestion question, AlertFocus::Timing timing)
      : _terminal(std::move(terminal)),
        _takenDown(std::move(takenDown)),
        _question(std::move(question)),
        _focus(Clock::now, timing) {
    if (!_question.subject) _focus.leaveOutDetails();
    tcgetattr(_terminal.number(), &_earlierSettings);
    termios keys = _earlierSettings;
    cfmakeraw(&keys);
    // What was typed before the alert stood there was meant for something else.
    tcsetattr(_terminal.number(), TCSAFLUSH, &keys);
    writeAll(_terminal.number(), "\r\n");
    draw();
  }

  ~TerminalAlertHandle() override { tcsetattr(_terminal.number(), TCSAFLUSH, &_earlierSettings); }

  void takeDown() const { eventfd_write(_takenDown.number(), 1); }

  AlertResponse waitForAnswer(Deadline deadline) {
    char buffer[64];
    while (true) {
      const std::size_t length = readKeys(buffer, deadline);
      if (length == 0) return AlertResponseNobody;
      std::string_view input(buffer, length);
      for (bool isAlone = true; !input.empty(); isAlone = false) {
        const std::string_view key = takeKey(input);
        if (isOneOf(key, {"\x1b", "\x03", "\x04"})) return AlertResponseNobody;
        const auto button = heed(key);
        // What comes in one piece with other keys was pasted, or typed ahead of this program.
        if (!button || !isAlone || !input.empty()) continue;
        return *button == AlertPlace::allow ? AlertResponseDefaultButton : AlertResponseAlternateButton;
      }
      drawAgain();
    }
  }

 private:
  // The button that the key presses, if it presses one.
  std::optional<AlertPlace> heed(std::string_view key) {
    if (isOneOf(key, {"\r", "\n", " "})) return _focus.press();
    if (key == "\t") {
      _focus.stepForward();
    } else if (key == "\x1b[Z") {
      _focus.stepBack();
    } else if (isOneOf(key, {"\x1b[D", "\x1bOD"})) {
      _focus.crossTo(AlertPlace::refuse);
    } else if (isOneOf(key, {"\x1b[C", "\x1bOC"})) {
      _focus.crossTo(AlertPlace::allow);
    } else {
      _focus.typed();
    }
    return std::nullopt;
  }

  void draw() {
    _drawn = _focus.place();
    const std::string dialog = drawDialog(_question, _drawn, columnsOfTerminal(_terminal.number()));
    _drawnLines = static_cast<std::size_t>(std::ranges::count(dialog, '\n'));
    writeAll(_terminal.number(), dialog);
  }

  void drawAgain() {
    if (_focus.place() == _drawn) return;
    writeAll(_terminal.number(), "\x1b[" + std::to_string(_drawnLines) + "A\r\x1b[J");
    draw();
  }

  // Waits for keys; 0 when there will be no answer: taken down, out of time, or the terminal is gone.
  std::size_t readKeys(std::span<char> buffer, Deadline deadline) const {
    while (true) {
      pollfd sources[] = {{.fd = _terminal.number(), .events = POLLIN, .revents = 0},
                          {.fd = _takenDown.number(), .events = POLLIN, .revents = 0}};
      const int ready = poll(sources, std::size(sources), millisecondsLeft(deadline));
      if (ready < 0 && errno == EINTR) continue;
      if (ready <= 0 || sources[1].revents != 0) return 0;

      const ssize_t length = read(_terminal.number(), buffer.data(), buffer.size());
      if (length < 0 && errno == EINTR) continue;
      return length > 0 ? static_cast<std::size_t>(length) : 0;
    }
  }

  FileDescriptor _terminal;
  FileDescriptor _takenDown;
  AlertQuestion _question;
  termios _earlierSettings{};
  AlertFocus _focus;
  AlertPlace _drawn = AlertPlace::text;
  std::size_t _drawnLines = 0;
};

std::shared_ptr<TerminalAlertHandle> own(const std::shared_ptr<AlertHandle>& handle) {
  return std::dynamic_pointer_cast<TerminalAlertHandle>(handle);
}

}  // namespace

bool TerminalAlert::isAvailable() const { return openTerminal(_options.terminal).isOpen(); }

std::shared_ptr<AlertHandle> TerminalAlert::createAlert(AlertAllocator, double, unsigned, int* errorPlace,
                                                        const AlertDescription& description) {
  FileDescriptor terminal = openTerminal(_options.terminal);
  FileDescriptor takenDown(eventfd(0, EFD_CLOEXEC));
  if (!terminal.isOpen() || !takenDown.isOpen()) {
    if (errorPlace != nullptr) *errorPlace = ENOTTY;
    return nullptr;
  }
  return std::make_shared<TerminalAlertHandle>(std::move(terminal), std::move(takenDown),
                                               askedQuestion(description, _options.subject(), _options.languages()),
                                               _options.timing);
}

int TerminalAlert::receiveResponse(const std::shared_ptr<AlertHandle>& handle, double timeoutSeconds, AlertResponse& response) {
  response = AlertResponseNobody;
  const auto alert = own(handle);
  if (alert == nullptr) return EINVAL;
  response = alert->waitForAnswer(deadlineAfter(timeoutSeconds));
  return 0;
}

// The handle restores the terminal when its last owner lets go of it.
void TerminalAlert::releaseAlert(std::shared_ptr<AlertHandle> handle) { handle.reset(); }

void TerminalAlert::takeDown(const std::shared_ptr<AlertHandle>& handle) {
  if (const auto alert = own(handle)) alert->takeDown();
}

}  // namespace palisade
