#include "Host/Daemon/OperationLog.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <vector>

namespace palisade {
namespace {

using testing::ElementsAre;

class Audit final : public Log {
 public:
  bool isEnabled(LogLevel level) const override { return level <= LogLevel::notice; }
  void write(const LogRecord&) override { ++records; }
  void logAccessRequest(const AccessRequestRecord& record) override { prompted.push_back(record.userPrompted); }

  int records = 0;
  std::vector<bool> prompted;
};

AccessRequestRecord decision(bool userPrompted) {
  AccessRequestRecord record;
  record.userPrompted = userPrompted;
  return record;
}

TEST(AnAuditRecord, SaysThatTheUserWasAskedOnlyIfAnAlertStood) {
  Audit audit;
  OperationLog log(audit);
  Operation unasked(nullptr);
  Operation asked(nullptr);
  asked.userIsAsked();
  log.logAccessRequest(decision(true));
  {
    const OperationScope scope(unasked);
    log.logAccessRequest(decision(true));
  }
  const OperationScope scope(asked);
  log.logAccessRequest(decision(true));
  log.logAccessRequest(decision(false));
  EXPECT_THAT(audit.prompted, ElementsAre(true, false, true, false));
}

TEST(AnOperationsLog, PassesEverythingElseThrough) {
  Audit audit;
  OperationLog log(audit);
  log.record("place", LogLevel::notice, "said", "");
  log.record("place", LogLevel::debug, "not said", "");
  EXPECT_EQ(audit.records, 1);
}

}  // namespace
}  // namespace palisade
