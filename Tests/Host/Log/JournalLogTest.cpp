#include "Host/Log/JournalLog.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <memory>
#include <optional>
#include <stdexcept>
#include <string>
#include <system_error>
#include <vector>

#include "Platform/Client.h"

namespace palisade {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

const std::string noJournal = "/nonexistent/socket";

// What a child process that runs `work` writes to stderr.
template <typename Work>
std::string stderrOf(const Work& work) {
  int pipeEnds[2];
  if (pipe(pipeEnds) != 0) throw std::system_error(errno, std::generic_category(), "pipe");
  const pid_t child = fork();
  if (child < 0) throw std::system_error(errno, std::generic_category(), "fork");
  if (child == 0) {
    dup2(pipeEnds[1], STDERR_FILENO);
    close(pipeEnds[0]);
    close(pipeEnds[1]);
    work();
    _exit(0);
  }
  close(pipeEnds[1]);
  std::string written;
  char buffer[512];
  ssize_t length = 0;
  while ((length = read(pipeEnds[0], buffer, sizeof buffer)) > 0) written.append(buffer, static_cast<std::size_t>(length));
  close(pipeEnds[0]);
  int status = 0;
  waitpid(child, &status, 0);
  EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0) << "The child ended with status " << status;
  return written;
}

class DescriptionCounter final : public Client {
 public:
  std::optional<std::string> bundleID() const override { return "com.example.editor"; }
  std::string localizedAppName() const override { return "Editor"; }
  bool hasEntitlement(std::string_view) const override { return false; }
  std::string description() const override {
    ++count;
    return "com.example.editor";
  }

  mutable int count = 0;
};

TEST(ALogWithoutAJournal, GoesToStderr) { EXPECT_EQ(JournalLog(LogLevel::notice, nullptr, noJournal).destination(), "stderr"); }

TEST(ALogWithAJournal, GoesThere) {
  // Whatever may be written to stands for the socket.
  EXPECT_EQ(JournalLog(LogLevel::notice, nullptr, "/dev/null").destination(), "journal");
}

TEST(ARecord, IsALineThatBeginsWithItsLevel) {
  EXPECT_EQ(stderrOf([] {
              JournalLog log(LogLevel::debug, nullptr, noJournal);
              log.record("open", LogLevel::error, "%@ is gone.", "what", std::string_view("The file"));
              log.record("open", LogLevel::notice, "%d accounts.", "count", std::size_t{2});
              log.record("open", LogLevel::debug, "Done.", "");
            }),
            "error: The file is gone.\nnotice: 2 accounts.\ndebug: Done.\n");
}

TEST(ARecord, StaysOneLineAndDoesNotSteerATerminal) {
  EXPECT_EQ(stderrOf([] {
              JournalLog(LogLevel::notice, nullptr, noJournal)
                  .record("ask", LogLevel::notice, "Asked\nfor %@.", "name",
                          std::string_view("Editor\r\nerror: \x1b[2J\x7f"
                                           "forged \u009b[2J \u202Edenied"));
            }),
            "notice: Asked\uFFFDfor Editor\uFFFD\uFFFDerror: \uFFFD[2J\uFFFDforged \uFFFD[2J \uFFFDdenied.\n");
}

TEST(ARecord, HoldsNoSecret) {
  EXPECT_EQ(stderrOf([] {
              JournalLog(LogLevel::notice, nullptr, noJournal)
                  .record("store", LogLevel::notice, "Stored %@.", "token",
                          std::string_view("EAAx7Qk2LmZ0vB9cRt5YpW3sHd8JfN1gUo4KaTe6"));
            }),
            "notice: Stored [masked].\n");
}

TEST(ARecordThatNobodyReads, IsNotRendered) {
  EXPECT_EQ(stderrOf([] {
              const auto client = std::make_shared<const DescriptionCounter>();
              JournalLog log(LogLevel::notice, nullptr, noJournal);
              log.record("ask", LogLevel::debug, "Asked for %@.", "client", std::shared_ptr<const Client>(client));
              const int unread = client->count;
              log.record("ask", LogLevel::notice, "%d, then %@.", "unread, client", static_cast<std::size_t>(unread),
                         std::shared_ptr<const Client>(client));
            }),
            "notice: 0, then com.example.editor.\n");
}

TEST(ALog, IsEnabledUpToItsLevel) {
  struct Case {
    LogLevel highest;
    std::vector<bool> enabled;  // error, notice, debug
  };
  for (const auto& [highest, enabled] : std::vector<Case>{{LogLevel::error, {true, false, false}},
                                                          {LogLevel::notice, {true, true, false}},
                                                          {LogLevel::debug, {true, true, true}}}) {
    const JournalLog log(highest, nullptr, noJournal);
    EXPECT_EQ(
        (std::vector<bool>{log.isEnabled(LogLevel::error), log.isEnabled(LogLevel::notice), log.isEnabled(LogLevel::debug)}),
        enabled);
  }
}

AccessRequestRecord requestOf(const std::string& bundleID, bool granted, bool userPrompted) {
  return {.accountTypeIdentifier = "com.example.type", .bundleID = bundleID, .granted = granted, .userPrompted = userPrompted};
}

TEST(AnAccessRequest, IsAuditedWhateverTheLevel) {
  std::vector<std::string> audited;
  JournalLog log(
      LogLevel::error, [&](const AccessRequestRecord& request) { audited.push_back(request.bundleID.value_or("none")); },
      noJournal);
  log.logAccessRequest(requestOf("com.example.asked", true, true));
  log.logAccessRequest(requestOf("com.example.quiet", false, false));
  log.logAccessRequest({.accountTypeIdentifier = "com.example.type", .bundleID = std::nullopt});
  EXPECT_THAT(audited, ElementsAre("com.example.asked", "com.example.quiet", "none"));
}

TEST(AnAccessRequest, IsANoticeWhenAPersonWasAskedAndForDebuggingOtherwise) {
  const auto written = [](LogLevel level) {
    return stderrOf([level] {
      JournalLog log(level, nullptr, noJournal);
      log.logAccessRequest(requestOf("com.example.asked", true, true));
      log.logAccessRequest(requestOf("com.example.quiet", false, false));
    });
  };
  const std::string asked = "notice: Access to com.example.type for com.example.asked was granted (the user was asked).\n";
  const std::string quiet = "debug: Access to com.example.type for com.example.quiet was refused (nobody was asked).\n";
  EXPECT_THAT(written(LogLevel::error), IsEmpty());
  EXPECT_EQ(written(LogLevel::notice), asked);
  EXPECT_EQ(written(LogLevel::debug), asked + quiet);
}

TEST(AnAuditThatFails, IsToldAndDoesNotStopTheRecord) {
  EXPECT_EQ(stderrOf([] {
              JournalLog log(
                  LogLevel::notice, [](const AccessRequestRecord&) { throw std::runtime_error("The disk is full."); },
                  noJournal);
              log.logAccessRequest(requestOf("com.example.asked", false, true));
            }),
            "error: An access request is not in the history: The disk is full.\n"
            "notice: Access to com.example.type for com.example.asked was refused (the user was asked).\n");
}

}  // namespace
}  // namespace palisade
