#pragma once

/// A log that writes into the trace. See `Log`. Threads: safe from every thread.

#include <atomic>

#include "Platform/Log.h"
#include "Testing/Instruments.h"

namespace palisade {

class FakeLog final : public Log {
 public:
  explicit FakeLog(Instruments instruments) : _instruments(instruments) {}

  /// Drops records of a higher number from now on; debug records are kept at first.
  void enableUpTo(LogLevel level) { _highestLevel = level; }

  bool isEnabled(LogLevel level) const override;
  void write(const LogRecord& record) override;
  void logAccessRequest(const AccessRequestRecord& record) override;

 private:
  Instruments _instruments;
  std::atomic<LogLevel> _highestLevel = LogLevel::debug;
};

}  // namespace palisade
