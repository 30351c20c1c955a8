// The desktop's alert, with a helper that misbehaves on demand: only one complete answer to this very question, followed by a
// clean exit, presses a button.

#include "Host/Alert/DesktopAlert.h"

#include <gmock/gmock.h>
#include <stdlib.h>

#include <chrono>
#include <csignal>
#include <fstream>
#include <future>
#include <iterator>

#include "Tests/Host/TemporaryFolder.h"

namespace palisade {
namespace {

using Steady = std::chrono::steady_clock;

AlertDescription orders(const std::string& title) {
  return {.header = title, .message = "“Photos” asks.", .alternateButtonTitle = "Don’t Allow", .defaultButtonTitle = "Allow"};
}

std::shared_ptr<AlertHandle> show(DesktopAlert& alert, const AlertDescription& description) {
  return alert.createAlert(AlertAllocator::defaultAllocator, 0, AlertFlagsPlain, nullptr, description);
}

AlertResponse responseTo(const std::string& title, double timeoutSeconds = 0) {
  DesktopAlert alert({.helper = SCRIPTED_HELPER});
  auto handle = show(alert, orders(title));
  AlertResponse response = 42;
  EXPECT_EQ(alert.receiveResponse(handle, timeoutSeconds, response), 0);
  alert.releaseAlert(std::move(handle));
  return response;
}

TEST(ADesktopAlert, IsAnsweredByEitherButton) {
  EXPECT_EQ(responseTo("allow"), AlertResponseDefaultButton);
  EXPECT_EQ(responseTo("refuse"), AlertResponseAlternateButton);
}

TEST(ADesktopAlert, IsNobodysAnswerHoweverElseTheHelperEnds) {
  const std::vector<std::string> endings = {
      "close",        "exit 0",        "exit 1",       "foreign",         "allow exit 1",  "allow exit 255",
      "allow allow",  "refuse allow",  "allow refuse", "text consent",    "allow text !",  "foreign allow",
      "text ! allow", "refuse exit 1", "close allow",  "foreign foreign", "allow foreign", "prefix 40 text 12345678"};
  for (const std::string& ending : endings) EXPECT_EQ(responseTo(ending), AlertResponseNobody) << ending;
}

TEST(ADesktopAlert, IsNobodysAnswerAfterEveryPrefixOfConsent) {
  for (std::size_t length = 0; length < alertAnswerSize; ++length) {
    EXPECT_EQ(responseTo("prefix " + std::to_string(length)), AlertResponseNobody) << length << " bytes";
  }
  EXPECT_EQ(responseTo("prefix " + std::to_string(alertAnswerSize)), AlertResponseDefaultButton);
}

TEST(ADesktopAlert, IsNobodysAnswerWhenAnySignalEndsTheHelper) {
  for (int signal = 1; signal < 32; ++signal) {
    const bool isIgnored = signal == SIGCHLD || signal == SIGCONT || signal == SIGURG || signal == SIGWINCH;
    const bool stops = signal == SIGSTOP || signal == SIGTSTP || signal == SIGTTIN || signal == SIGTTOU;
    if (isIgnored || stops) continue;
    EXPECT_EQ(responseTo("signal " + std::to_string(signal)), AlertResponseNobody) << strsignal(signal);
    EXPECT_EQ(responseTo("allow signal " + std::to_string(signal)), AlertResponseNobody)
        << strsignal(signal) << " after consent";
  }
}

TEST(ADesktopAlert, DoesNotWaitForAHelperThatStaysAfterItsAnswer) {
  EXPECT_EQ(responseTo("allow linger"), AlertResponseNobody);
}

TEST(ADesktopAlert, DoesNotWaitForAHelperThatIsStoppedAfterItsAnswer) {
  EXPECT_EQ(responseTo("allow signal " + std::to_string(SIGSTOP)), AlertResponseNobody);
}

TEST(ADesktopAlert, EndsUnansweredWhenItsTimeIsOver) { EXPECT_EQ(responseTo("linger", 0.01), AlertResponseNobody); }

TEST(ADesktopAlert, EndsUnansweredWithinASecondWhenItIsTakenDown) {
  DesktopAlert alert({.helper = SCRIPTED_HELPER});
  const auto handle = show(alert, orders("linger"));
  auto answer = std::async(std::launch::async, [&] {
    AlertResponse response = 0;
    alert.receiveResponse(handle, 0, response);
    return response;
  });
  const auto before = Steady::now();
  DesktopAlert::takeDown(handle);
  EXPECT_EQ(answer.get(), AlertResponseNobody);
  EXPECT_LT(Steady::now() - before, std::chrono::seconds(1));
}

TEST(ADesktopAlert, IsNobodysAnswerWhenItWasTakenDownBeforeAnyoneWaited) {
  DesktopAlert alert({.helper = SCRIPTED_HELPER});
  const auto handle = show(alert, orders("allow"));
  DesktopAlert::takeDown(handle);
  AlertResponse response = 0;
  alert.receiveResponse(handle, 0, response);
  EXPECT_EQ(response, AlertResponseNobody);
}

TEST(ADesktopAlert, IsReleasedWithoutAnAnswer) {
  DesktopAlert alert({.helper = SCRIPTED_HELPER});
  const auto before = Steady::now();
  alert.releaseAlert(show(alert, orders("linger")));
  EXPECT_LT(Steady::now() - before, std::chrono::seconds(1));
}

TEST(ADesktopAlert, StandsBesideOthersWithAnAnswerOfItsOwn) {
  DesktopAlert alert({.helper = SCRIPTED_HELPER});
  const auto refused = show(alert, orders("refuse"));
  const auto allowed = show(alert, orders("allow"));
  AlertResponse first = 42;
  AlertResponse second = 42;
  alert.receiveResponse(refused, 0, first);
  alert.receiveResponse(allowed, 0, second);
  EXPECT_EQ(first, AlertResponseAlternateButton);
  EXPECT_EQ(second, AlertResponseDefaultButton);
}

TEST(ADesktopAlert, HandsOnNoVariableThatLoadsCodeIntoTheHelper) {
  const TemporaryFolder folder;
  const auto file = folder.path() / "environment";
  for (const char* name : {"LD_LIBRARY_PATH", "GTK_MODULES", "GIO_EXTRA_MODULES", "TOKEN"}) setenv(name, "/nonexistent", 1);
  setenv("DISPLAY", ":99", 1);
  AlertDescription description = orders("environment allow");
  description.message = file.string();
  DesktopAlert alert({.helper = SCRIPTED_HELPER});
  const auto handle = show(alert, description);
  AlertResponse response = 42;
  alert.receiveResponse(handle, 0, response);
  ASSERT_EQ(response, AlertResponseDefaultButton);
  std::ifstream stream(file);
  const std::string environment{std::istreambuf_iterator<char>(stream), {}};
  EXPECT_THAT(environment, testing::HasSubstr("DISPLAY=:99"));
  EXPECT_THAT(environment, testing::Not(testing::HasSubstr("/nonexistent")));
}

TEST(ADesktopAlertWithoutAHelper, IsNotCreatedAndIsNobodysAnswer) {
  for (const char* program : {"/nonexistent", "/etc/passwd"}) {
    DesktopAlert alert({.helper = program});
    int error = 0;
    EXPECT_EQ(alert.createAlert(AlertAllocator::defaultAllocator, 0, AlertFlagsPlain, &error, orders("allow")), nullptr);
    EXPECT_NE(error, 0);
    EXPECT_FALSE(alert.isInstalled());
  }
  DesktopAlert alert({.helper = "/nonexistent"});
  AlertResponse response = 0;
  EXPECT_NE(alert.receiveResponse(nullptr, 0, response), 0);
  EXPECT_EQ(response, AlertResponseNobody);
}

TEST(ADesktopAlertThatSaysTooMuch, IsNotCreated) {
  DesktopAlert alert({.helper = SCRIPTED_HELPER});
  AlertDescription description = orders("allow");
  description.message = std::string(longestAlertQuestion, 'x');
  EXPECT_EQ(show(alert, description), nullptr);
}

}  // namespace
}  // namespace palisade
