#include "Testing/FakeLog.h"

#include <utility>

#include "Platform/Format.h"
#include "Testing/TraceValue.h"

namespace palisade {

bool FakeLog::isEnabled(LogLevel level) const {
  _instruments.faults.enter("Log.isEnabled");
  return level <= _highestLevel.load();
}

void FakeLog::write(const LogRecord& record) {
  _instruments.faults.enter("Log.write");
  // Rendering asks clients and accounts for their descriptions; that is the log's doing, not the plug-in's.
  const FaultInjector::Pause pause;
  Array arguments;
  for (const LogArgument& argument : record.arguments) arguments.emplace_back(describe(argument));
  _instruments.trace.record("log", {{"level", static_cast<int>(record.level)},
                                    {"operationName", record.place.operationName},
                                    {"format", record.format},
                                    {"args", std::move(arguments)},
                                    {"argumentNames", record.argumentNames},
                                    {"rendered", formatLogMessage(record)}});
}

void FakeLog::logAccessRequest(const AccessRequestRecord& record) {
  _instruments.faults.enter("Log.logAccessRequest");
  _instruments.trace.record("logAccessRequest", {{"accountType", record.accountTypeIdentifier},
                                                 {"bundleID", traceText(record.bundleID)},
                                                 {"granted", record.granted},
                                                 {"userPrompted", record.userPrompted},
                                                 {"elapsed", record.elapsedSeconds}});
}

}  // namespace palisade
