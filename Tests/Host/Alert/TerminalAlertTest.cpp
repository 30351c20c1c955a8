// The terminal's alert, on a real pseudo-terminal: only the allow button, pressed when the selection has stood there for long
// enough, is consent.

#include "Host/Alert/TerminalAlert.h"

#include <fcntl.h>
#include <gmock/gmock.h>
#include <poll.h>
#include <stdlib.h>
#include <termios.h>
#include <unistd.h>

#include <cerrno>
#include <future>
#include <string>

namespace palisade {
namespace {

using std::chrono::hours;
using testing::AllOf;
using testing::HasSubstr;

constexpr AlertResponse nobody = AlertResponseNobody;
constexpr AlertFocus::Timing atOnce{.wait = {}, .quiet = {}};

class ATerminalAlert : public testing::Test {
 protected:
  void SetUp() override {
    _screen = posix_openpt(O_RDWR | O_NOCTTY | O_CLOEXEC);
    ASSERT_GE(_screen, 0);
    ASSERT_EQ(grantpt(_screen), 0);
    ASSERT_EQ(unlockpt(_screen), 0);
    _terminal = ptsname(_screen);
  }

  void TearDown() override {
    if (_screen >= 0) close(_screen);
  }

  // Shows an alert, waits until it stands on the screen, types `keys` one after another and answers what became of it. A key
  // that moves the selection has the dialog drawn again.
  AlertResponse answerAfter(std::initializer_list<std::string> keys, const AlertFocus::Timing& timing = atOnce) {
    TerminalAlert alert({.terminal = _terminal, .subject = photos, .timing = timing});
    const auto handle = alert.createAlert(AlertAllocator::defaultAllocator, 0, AlertFlagsPlain, nullptr, _description);
    readUntil("┘");
    auto answer = std::async(std::launch::async, [&] {
      AlertResponse response = 42;
      alert.receiveResponse(handle, 0, response);
      return response;
    });
    for (const std::string& key : keys) {
      type(key);
      if (key == "\t" || key.starts_with("\x1b[")) readUntil("┘");
    }
    return answer.get();
  }

  static std::optional<AlertSubject> photos() {
    return AlertSubject{.applicationName = "Photos", .applicationID = "org.example.photos"};
  }

  void type(const std::string& key) { ASSERT_EQ(write(_screen, key.data(), key.size()), static_cast<ssize_t>(key.size())); }

  std::string readUntil(const std::string& end) {
    std::string text;
    char byte = 0;
    while (!text.ends_with(end) && read(_screen, &byte, 1) == 1) text += byte;
    return text;
  }

  AlertDescription _description{
      .header = "Facebook", .message = "“Photos” asks.", .alternateButtonTitle = "Don’t Allow", .defaultButtonTitle = "Allow"};
  std::string _terminal;
  int _screen = -1;
};

TEST_F(ATerminalAlert, IsAnsweredByTheDefaultButtonWhenItIsSelected) {
  for (const char* press : {"\r", "\n", " "}) EXPECT_EQ(answerAfter({"\t", "\t", "\t", press}), AlertResponseDefaultButton);
}

TEST_F(ATerminalAlert, IsAnsweredByTheAlternateButtonWhenItIsSelected) {
  for (const char* press : {"\r", "\n", " "}) EXPECT_EQ(answerAfter({"\t", "\t", press}), AlertResponseAlternateButton);
}

TEST_F(ATerminalAlert, HasItsSelectionMovedBetweenItsButtonsByArrows) {
  EXPECT_EQ(answerAfter({"\t", "\t", "\x1b[C", "\r"}), AlertResponseDefaultButton);
  EXPECT_EQ(answerAfter({"\t", "\t", "\x1b[C", "\x1b[D", "\r"}), AlertResponseAlternateButton);
  EXPECT_EQ(answerAfter({"\t", "\t", "\t", "\x1b[Z", "\r"}), AlertResponseAlternateButton);
}

TEST_F(ATerminalAlert, IsNotAnsweredAtItsTextAndItsDetails) {
  EXPECT_EQ(answerAfter({"\r", " ", "\x1b"}), nobody);
  EXPECT_EQ(answerAfter({"\t", "\r", "\x1b"}), nobody);
}

TEST_F(ATerminalAlert, TakesKeysWithAltForTyping) {
  EXPECT_EQ(answerAfter({"\x1b"
                         "a",
                         "\x1b"
                         "d",
                         "\r", "\x03"}),
            nobody);
}

TEST_F(ATerminalAlert, TakesWhatComesInOnePieceForTyping) {
  EXPECT_EQ(answerAfter({"\t\t\t\r", "\x03"}), nobody);
  EXPECT_EQ(answerAfter({"\t", "\t", "\t", "\rls\r", "\x03"}), nobody);
}

TEST_F(ATerminalAlert, TakesEscapeInterruptAndEndOfFileForNobodysAnswer) {
  for (const char* key : {"\x1b", "\x03", "\x04"}) EXPECT_EQ(answerAfter({key}), nobody);
}

TEST_F(ATerminalAlert, SaysWhoAsksInTheUsersLanguage) {
  TerminalAlert alert({.terminal = _terminal, .subject = photos, .languages = [] { return "de"; }});
  const auto handle = alert.createAlert(AlertAllocator::defaultAllocator, 0, AlertFlagsPlain, nullptr, _description);
  EXPECT_THAT(readUntil("┘"),
              AllOf(HasSubstr("Anwendung  Photos"), HasSubstr("org.example.photos"), HasSubstr("Nur behauptet")));
}

TEST_F(ATerminalAlert, IgnoresKeysThatMeanNothing) { EXPECT_EQ(answerAfter({"y", "\x1b"}), nobody); }

TEST_F(ATerminalAlert, AnswersNothingBeforeItsSelectionHasStoodLongEnough) {
  for (const auto& keys :
       {std::initializer_list<std::string>{"\t", "\t", "\r", "\r", "\x03"}, {"\t", "\t", "\t", " ", "\x03"}}) {
    EXPECT_EQ(answerAfter(keys, {.wait = hours(1), .quiet = {}}), nobody);
  }
}

TEST_F(ATerminalAlert, ForgetsWhatWasTypedBeforeItStood) {
  const int early = open(_terminal.c_str(), O_RDWR | O_NOCTTY | O_CLOEXEC);
  type("\r");
  // What is typed reaches the terminal a moment later.
  pollfd typed{.fd = early, .events = POLLIN, .revents = 0};
  ASSERT_EQ(poll(&typed, 1, -1), 1);
  EXPECT_EQ(answerAfter({"\x1b"}), nobody);
  close(early);
}

TEST_F(ATerminalAlert, EndsUnansweredWhenTheTerminalHangsUp) {
  TerminalAlert alert({.terminal = _terminal, .timing = atOnce});
  const auto handle = alert.createAlert(AlertAllocator::defaultAllocator, 0, AlertFlagsPlain, nullptr, _description);
  close(_screen);
  _screen = -1;
  AlertResponse response = 0;
  EXPECT_EQ(alert.receiveResponse(handle, 0, response), 0);
  EXPECT_EQ(response, nobody);
}

TEST_F(ATerminalAlert, EndsUnansweredWhenItIsTakenDown) {
  TerminalAlert alert({.terminal = _terminal, .timing = atOnce});
  const auto handle = alert.createAlert(AlertAllocator::defaultAllocator, 0, AlertFlagsPlain, nullptr, _description);
  auto answer = std::async(std::launch::async, [&] {
    AlertResponse response = 0;
    alert.receiveResponse(handle, 0, response);
    return response;
  });
  TerminalAlert::takeDown(handle);
  EXPECT_EQ(answer.get(), nobody);
}

TEST_F(ATerminalAlert, EndsUnansweredWhenItsTimeIsOver) {
  TerminalAlert alert({.terminal = _terminal});
  const auto handle = alert.createAlert(AlertAllocator::defaultAllocator, 0, AlertFlagsPlain, nullptr, _description);
  AlertResponse response = 0;
  alert.receiveResponse(handle, 0.001, response);
  EXPECT_EQ(response, nobody);
}

TEST_F(ATerminalAlert, GivesTheTerminalBackAsItWas) {
  const int terminal = open(_terminal.c_str(), O_RDWR | O_NOCTTY | O_CLOEXEC);
  termios before{};
  tcgetattr(terminal, &before);
  TerminalAlert alert({.terminal = _terminal});
  auto handle = alert.createAlert(AlertAllocator::defaultAllocator, 0, AlertFlagsPlain, nullptr, _description);
  termios during{};
  tcgetattr(terminal, &during);
  EXPECT_EQ(during.c_lflag & ECHO, 0U);
  alert.releaseAlert(std::move(handle));
  termios after{};
  tcgetattr(terminal, &after);
  EXPECT_EQ(after.c_lflag, before.c_lflag);
  close(terminal);
}

TEST(ATerminalAlertWithoutATerminal, IsNotCreatedAndIsNobodysAnswer) {
  for (const char* path : {"/nonexistent", "/dev/null"}) {
    TerminalAlert alert({.terminal = path});
    EXPECT_FALSE(alert.isAvailable());
    int error = 0;
    const auto handle = alert.createAlert(AlertAllocator::defaultAllocator, 0, AlertFlagsPlain, &error, {});
    EXPECT_EQ(handle, nullptr);
    EXPECT_EQ(error, ENOTTY);
    AlertResponse response = 0;
    EXPECT_NE(alert.receiveResponse(handle, 0, response), 0);
    EXPECT_EQ(response, nobody);
  }
}

}  // namespace
}  // namespace palisade
