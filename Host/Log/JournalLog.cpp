#include "Host/Log/JournalLog.h"

// Places come from the record, not from this file.
#define SD_JOURNAL_SUPPRESS_LOCATION
#include <systemd/sd-journal.h>
#include <unistd.h>

#include <cstdio>
#include <exception>
#include <string>

#include "Host/Log/Redaction.h"
#include "Host/Text/PrintableText.h"

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

void writeToStderr(LogLevel level, std::string_view message) {
  // A record is one line, and what it quotes does not steer the terminal that shows it.
  const std::string line = std::string(nameOf(level)) + ": " + printableText(message) + "\n";
  std::fwrite(line.data(), 1, line.size(), stderr);
}

}  // namespace

JournalLog::JournalLog(LogLevel highestLevel, AuditSink audit, const std::string& journalSocket)
    : _highestLevel(highestLevel),
      _audit(std::move(audit)),
      _hasJournal(access(journalSocket.c_str(), W_OK) == 0) {}

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
  writeToStderr(record.level, message);
}

void JournalLog::logAccessRequest(const AccessRequestRecord& request) {
  try {
    if (_audit) _audit(request);
  } catch (const std::exception& error) {
    writeToStderr(LogLevel::error, KnownSecrets::ofProcess().withoutSecrets(
                                       redactedText(std::string("An access request is not in the history: ") + error.what())));
  }
  record("logAccessRequest", request.userPrompted ? LogLevel::notice : LogLevel::debug, "Access to %@ for %@ was %@ (%@).",
         "accountTypeIdentifier, bundleID, granted, userPrompted", request.accountTypeIdentifier, request.bundleID,
         std::string_view(request.granted ? "granted" : "refused"),
         std::string_view(request.userPrompted ? "the user was asked" : "nobody was asked"));
}

}  // namespace palisade
