#pragma once

/// The log as the plug-ins see it: it knows whether the user was asked.
///
/// A plug-in calls every answer to its alert a user's. An alert that never stood before the user (the application cools down,
/// or there is nobody to ask) was nobody's: the audit record then says that the user was not asked. Everything else passes
/// through. Threads: as `Log` says. Ownership: borrows the log. Errors: none.

#include "Host/Daemon/Operation.h"
#include "Platform/Log.h"

namespace palisade {

class OperationLog final : public Log {
 public:
  explicit OperationLog(Log& log) : _log(log) {}

  bool isEnabled(LogLevel level) const override { return _log.isEnabled(level); }
  void write(const LogRecord& record) override { _log.write(record); }

  void logAccessRequest(const AccessRequestRecord& record) override {
    const Operation* operation = Operation::current();
    AccessRequestRecord seen = record;
    if (operation != nullptr && !operation->wasUserAsked()) seen.userPrompted = false;
    _log.logAccessRequest(seen);
  }

 private:
  Log& _log;
};

}  // namespace palisade
