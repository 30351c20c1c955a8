#pragma once

/// One scenario in a process of its own, so that process-wide state of the module starts fresh and a crash ends nothing else.
///
/// Threads: made and asked by one thread, while it is the only one of its process. Ownership: the child dies with its parent.
/// Errors: `std::system_error` when no process can be started. Whatever happens in the child is a result.

#include <functional>
#include <optional>
#include <string>

namespace palisade {

enum class ScenarioOutcome { carriedOut, crashed, malformed };

struct ScenarioResult {
  /// JSON on one line, without its end.
  std::string line;
  ScenarioOutcome outcome = ScenarioOutcome::carriedOut;
};

/// Carries a scenario's text out. It runs in the child and says the scenario's ID as soon as it knows it, for the case that it
/// does not come back.
using AnnounceID = std::function<void(const std::optional<std::string>& scenarioID)>;
using CarryOut = std::function<ScenarioResult(const std::string& text, const AnnounceID& announceID)>;

class ScenarioProcess {
 public:
  ScenarioProcess(const std::string& text, const CarryOut& carryOut);
  ~ScenarioProcess();

  ScenarioProcess(const ScenarioProcess&) = delete;
  ScenarioProcess& operator=(const ScenarioProcess&) = delete;

  /// Readable when there is something for `advance`; -1 once the process has ended.
  int descriptor() const { return _output >= 0 ? _output : _process; }
  bool hasEnded() const { return descriptor() < 0; }

  /// Takes in what the process has written or notes its end, waiting for it if need be.
  void advance();

  /// Of a process that has ended.
  const ScenarioResult& result() const { return _result; }

 private:
  void readOutput();
  void noteEnd();

  /// The end of the pipe, then the process itself; each -1 once it is done with.
  int _output = -1;
  int _process = -1;
  std::string _text;
  ScenarioResult _result;
};

}  // namespace palisade
