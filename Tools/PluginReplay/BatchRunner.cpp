#include "Tools/PluginReplay/BatchRunner.h"

#include <poll.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <deque>
#include <optional>
#include <ostream>
#include <string>
#include <system_error>
#include <utility>
#include <vector>

#include <unistd.h>

namespace palisade {
namespace {

// The lines of a descriptor, without a thread: whoever has other things to wait for asks before it reads.
class LineReader {
 public:
  explicit LineReader(int descriptor) : _descriptor(descriptor) {}

  int descriptor() const { return _descriptor; }
  bool canRead() const { return !_isAtEnd; }
  bool isExhausted() const { return _isAtEnd && _start == _text.size(); }

  void read() {
    std::array<char, 65536> buffer;
    const ssize_t length = ::read(_descriptor, buffer.data(), buffer.size());
    if (length > 0) {
      _text.append(buffer.data(), static_cast<std::size_t>(length));
    } else if (length == 0) {
      _isAtEnd = true;
    } else if (errno != EINTR) {
      throw std::system_error(errno, std::generic_category(), "cannot read the scenarios");
    }
  }

  /// The next line that is complete, or none.
  std::optional<std::string> next() {
    const std::size_t end = _text.find('\n', std::max(_searched, _start));
    if (end == std::string::npos) {
      _text.erase(0, std::exchange(_start, 0));
      _searched = _text.size();
      if (!_isAtEnd || _text.empty()) return std::nullopt;
      return std::exchange(_text, {});
    }
    std::string line = _text.substr(_start, end - _start);
    _start = end + 1;
    return line;
  }

 private:
  int _descriptor;
  std::string _text;
  std::size_t _start = 0;
  std::size_t _searched = 0;
  bool _isAtEnd = false;
};

class Batch {
 public:
  Batch(int inputDescriptor, std::ostream& output, std::size_t atOnce, const CarryOut& carryOut)
      : _lines(inputDescriptor),
        _output(output),
        _atOnce(atOnce),
        _carryOut(carryOut) {}

  ScenarioOutcome run() {
    do {
      start();
      wait();
    } while (write() || !_processes.empty() || !_lines.isExhausted());
    return _worst;
  }

 private:
  // Results that wait behind a slow scenario are held; this many processes' worth of them and no more.
  static constexpr std::size_t held = 16;

  bool hasRoom() const {
    const auto running = std::ranges::count_if(_processes, [](const ScenarioProcess& each) { return !each.hasEnded(); });
    return static_cast<std::size_t>(running) < _atOnce && _processes.size() < _atOnce * held;
  }

  void start() {
    while (hasRoom()) {
      const auto line = _lines.next();
      if (!line) return;
      _processes.emplace_back(*line, _carryOut);
    }
  }

  void wait() {
    std::vector<pollfd> waitedFor;
    for (const ScenarioProcess& process : _processes) {
      if (!process.hasEnded()) waitedFor.push_back({.fd = process.descriptor(), .events = POLLIN, .revents = 0});
    }
    if (hasRoom() && _lines.canRead()) waitedFor.push_back({.fd = _lines.descriptor(), .events = POLLIN, .revents = 0});
    if (waitedFor.empty() || poll(waitedFor.data(), waitedFor.size(), -1) < 0) return;
    for (const pollfd& ready : waitedFor) {
      if (ready.revents != 0) read(ready.fd);
    }
  }

  void read(int descriptor) {
    const auto process = std::ranges::find(_processes, descriptor, &ScenarioProcess::descriptor);
    if (process == _processes.end()) {
      _lines.read();
    } else {
      process->advance();
    }
  }

  // Whether there was something to write, and so room for more.
  bool write() {
    const std::size_t before = _processes.size();
    while (!_processes.empty() && _processes.front().hasEnded()) {
      const ScenarioResult& result = _processes.front().result();
      _worst = std::max(_worst, result.outcome);
      _output << result.line << '\n';
      _processes.pop_front();
    }
    if (_processes.size() == before) return false;
    _output.flush();
    return true;
  }

  LineReader _lines;
  std::ostream& _output;
  std::size_t _atOnce;
  const CarryOut& _carryOut;
  std::deque<ScenarioProcess> _processes;
  ScenarioOutcome _worst = ScenarioOutcome::carriedOut;
};

}  // namespace

ScenarioOutcome runBatch(int inputDescriptor, std::ostream& output, std::size_t atOnce, const CarryOut& carryOut) {
  return Batch(inputDescriptor, output, atOnce, carryOut).run();
}

}  // namespace palisade
