#include "Host/Alert/TerminalAlert.h"

#include <fcntl.h>
#include <poll.h>
#include <sys/eventfd.h>
#include <sys/ioctl.h>
#include <termios.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <span>
#include <string_view>
#include <utility>

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

enum class Key { none, selectRefuse, selectAllow, selectOther, press, close };

// Takes the first key off `input`, which is not empty: an escape sequence (ECMA-48) or a byte. One read may bring several.
std::string_view takeKey(std::string_view& input) {
  std::size_t length = 1;
  if (input.starts_with("\x1bO")) {
    length = std::min<std::size_t>(input.size(), 3);
  } else if (input.starts_with("\x1b[")) {
    length = 2;
    while (length < input.size() && (input[length] < '@' || input[length] > '~')) ++length;
    length = std::min(input.size(), length + 1);
  }
  const std::string_view key = input.substr(0, length);
  input.remove_prefix(length);
  return key;
}

// The keys of a two-button dialog. An escape sequence that is not an arrow is no key of ours; a lone Escape closes.
Key keyOf(std::string_view input) {
  if (input == "\x1b[D" || input == "\x1bOD") return Key::selectRefuse;
  if (input == "\x1b[C" || input == "\x1bOC") return Key::selectAllow;
  if (input == "\t" || input == "\x1b[Z") return Key::selectOther;
  if (input == "\r" || input == "\n" || input == " ") return Key::press;
  if (input == "\x1b" || input == "\x03" || input == "\x04") return Key::close;
  return Key::none;
}

class TerminalAlertHandle final : public AlertHandle {
 public:
  TerminalAlertHandle(FileDescriptor terminal, FileDescriptor takenDown, AlertQuestion question)
      : _terminal(std::move(terminal)),
        _takenDown(std::move(takenDown)),
        _question(std::move(question)) {
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

  AlertResponse waitForAnswer(std::chrono::milliseconds armedAfter, Deadline deadline) {
    Clock::time_point armedAt = Clock::now() + armedAfter;
    char buffer[64];
    while (true) {
      const std::size_t length = readKeys(buffer, deadline);
      if (length == 0) return AlertResponseNobody;
      for (std::string_view input(buffer, length); !input.empty();) {
        switch (keyOf(takeKey(input))) {
          case Key::close: return AlertResponseNobody;
          case Key::selectRefuse: select(DialogButton::refuse); break;
          case Key::selectAllow: select(DialogButton::allow); break;
          case Key::selectOther: select(_selected == DialogButton::refuse ? DialogButton::allow : DialogButton::refuse); break;
          case Key::press:
            if (_selected == DialogButton::refuse) return AlertResponseAlternateButton;
            if (Clock::now() >= armedAt) return AlertResponseDefaultButton;
            armedAt = Clock::now() + armedAfter;
            break;
          case Key::none: break;
        }
      }
    }
  }

 private:
  void draw() {
    const std::string dialog = drawDialog(_question, _selected, columnsOfTerminal(_terminal.number()));
    _drawnLines = static_cast<std::size_t>(std::ranges::count(dialog, '\n'));
    writeAll(_terminal.number(), dialog);
  }

  void select(DialogButton button) {
    _selected = button;
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
  DialogButton _selected = DialogButton::allow;
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
                                               askedQuestion(description, _options.subject(), _options.languages()));
}

int TerminalAlert::receiveResponse(const std::shared_ptr<AlertHandle>& handle, double timeoutSeconds, AlertResponse& response) {
  response = AlertResponseNobody;
  const auto alert = own(handle);
  if (alert == nullptr) return EINVAL;
  response = alert->waitForAnswer(_options.armedAfter, deadlineAfter(timeoutSeconds));
  return 0;
}

// The handle restores the terminal when its last owner lets go of it.
void TerminalAlert::releaseAlert(std::shared_ptr<AlertHandle> handle) { handle.reset(); }

void TerminalAlert::takeDown(const std::shared_ptr<AlertHandle>& handle) {
  if (const auto alert = own(handle)) alert->takeDown();
}

}  // namespace palisade
