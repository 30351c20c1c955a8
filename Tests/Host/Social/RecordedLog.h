#pragma once

/// A log whose lines a test can read.
///
/// Threads: safe from every thread.

#include <mutex>
#include <string>

#include "Platform/Format.h"
#include "Platform/Log.h"

class RecordedLog final : public palisade::Log {
 public:
  bool isEnabled(palisade::LogLevel) const override { return true; }

  void write(const palisade::LogRecord& record) override {
    const std::lock_guard lock(_mutex);
    _text += palisade::formatLogMessage(record) + "\n";
  }

  void logAccessRequest(const palisade::AccessRequestRecord&) override {}

  std::string text() const {
    const std::lock_guard lock(_mutex);
    return _text;
  }

 private:
  mutable std::mutex _mutex;
  std::string _text;
};
