#include "Host/Log/JournalLog.h"

// Places come from the record, not from this file.
#define SD_JOURNAL_SUPPRESS_LOCATION
#include <systemd/sd-journal.h>
#include <unistd.h>

#include <cstdio>
#include <string>

#include "Host/Log/Redaction.h"

namespace palisade {
namespace {

std::string_view nameOf(LogLevel level) {
  switch (level) {
    case LogLevel::error: return "error";
    case LogLevel::notice: return "notice";
    case LogLevel::debug: break;
  }
  return "debug";
}

}  // namespace

JournalLog::JournalLog(LogLevel highestLevel, AuditSink audit)
    : _highestLevel(highestLevel),
      _audit(std::move(audit)),
      _hasJournal(access("/run/systemd/journal/socket", W_OK) == 0) {}

std::string_view JournalLog::destination() const { return _hasJournal ? "journal" : "stderr"; }

void JournalLog::write(const LogRecord& record) {
  const std::string message = redactedMessage(record);
  const std::string operation(record.place.operationName);
  if (_hasJournal) {
    const std::string file = std::string("CODE_FILE=") + record.place.where.file_name();
    const std::string line = "CODE_LINE=" + std::to_string(record.place.where.line());
    sd_journal_send_with_location(file.c_str(), line.c_str(), operation.c_str(), "MESSAGE=%s", message.c_str(), "PRIORITY=%d",
                                  static_cast<int>(record.level), nullptr);
    return;
  }
  std::string line(nameOf(record.level));
  for (const char character : message) line += character == '\n' ? ' ' : character;
  line.insert(nameOf(record.level).size(), ": ");
  line += "\n";
  std::fwrite(line.data(), 1, line.size(), stderr);
}

void JournalLog::logAccessRequest(const AccessRequestRecord& request) {
  if (_audit) _audit(request);
  record("logAccessRequest", request.userPrompted ? LogLevel::notice : LogLevel::debug, "Access to %@ for %@ was %@ (%@).",
         "accountTypeIdentifier, bundleID, granted, userPrompted", request.accountTypeIdentifier, request.bundleID,
         std::string_view(request.granted ? "granted" : "refused"),
         std::string_view(request.userPrompted ? "the user was asked" : "nobody was asked"));
}

}  // namespace palisade
