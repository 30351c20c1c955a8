#pragma once

/// The daemon's log: systemd's journal, or one readable line on stderr where there is no journal.
///
/// Records carry their source file, line, operation and level as the journal's own fields (systemd.journal-fields(7)). Secrets
/// are taken out before anything is rendered. Access-request records are handed to an audit sink; those that
/// a person was asked about are logged as notices too, the others only for debugging.
/// Threads: safe from every thread; the sink is called on the thread that logs. Ownership: owns nothing but its level. Errors:
/// a record that cannot be written is lost; a sink that fails is told on stderr.

#include <atomic>
#include <functional>
#include <string>

#include "Platform/Log.h"

namespace palisade {

class JournalLog final : public Log {
 public:
  using AuditSink = std::function<void(const AccessRequestRecord&)>;

  /// `journalSocket` is where a journal listens, if there is one.
  JournalLog(LogLevel highestLevel, AuditSink audit, const std::string& journalSocket = "/run/systemd/journal/socket");

  bool isEnabled(LogLevel level) const override { return level <= _highestLevel; }
  void write(const LogRecord& record) override;
  void logAccessRequest(const AccessRequestRecord& request) override;

  /// "journal" or "stderr".
  std::string_view destination() const;

 private:
  const LogLevel _highestLevel;
  const AuditSink _audit;
  const bool _hasJournal;
};

}  // namespace palisade
