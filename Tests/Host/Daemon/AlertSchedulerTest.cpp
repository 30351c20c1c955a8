// Who may be shown to the user, in which order, and what the operations of the others are told.

#include "Host/Daemon/AlertScheduler.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <cerrno>
#include <condition_variable>
#include <future>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "Host/Daemon/Operation.h"
#include "Platform/Format.h"

namespace palisade {
namespace {

using testing::AllOf;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;

// A user in front of a screen, on which a test looks and for whom it answers.
class Screen final : public SystemAlert {
 public:
  std::shared_ptr<AlertHandle> createAlert(AlertAllocator, double, unsigned, int*, const AlertDescription& alert) override {
    const std::lock_guard lock(_mutex);
    if (!hasDisplay) return nullptr;
    _shown.push_back(alert.header);
    _answer.reset();
    _hasChanged.notify_all();
    return std::make_shared<AlertHandle>();
  }
  int receiveResponse(const std::shared_ptr<AlertHandle>&, double, AlertResponse& response) override {
    std::unique_lock lock(_mutex);
    _hasChanged.wait(lock, [&] { return _answer.has_value(); });
    response = *_answer;
    return status;
  }
  void releaseAlert(std::shared_ptr<AlertHandle>) override {}

  void answer(AlertResponse response) {
    const std::lock_guard lock(_mutex);
    _answer = response;
    _hasChanged.notify_all();
  }
  void waitForAlert(std::size_t number) {
    std::unique_lock lock(_mutex);
    _hasChanged.wait(lock, [&] { return _shown.size() >= number; });
  }
  std::vector<std::string> shown() {
    const std::lock_guard lock(_mutex);
    return _shown;
  }

  bool hasDisplay = true;
  int status = 0;

 private:
  std::mutex _mutex;
  std::condition_variable _hasChanged;
  std::vector<std::string> _shown;
  std::optional<AlertResponse> _answer;
};

AlertDescription titled(const std::string& title) {
  AlertDescription alert;
  alert.header = title;
  return alert;
}

class Notices final : public Log {
 public:
  bool isEnabled(LogLevel level) const override { return level <= LogLevel::notice; }
  void write(const LogRecord& record) override { messages.push_back(formatLogMessage(record)); }
  void logAccessRequest(const AccessRequestRecord&) override {}

  std::vector<std::string> messages;
};

class Alerts : public testing::Test {
 protected:
  // An application's operation, which asks the user on a thread of its own.
  struct Asking {
    std::shared_ptr<Operation> operation;
    std::future<AlertResponse> response;
  };

  Asking ask(const std::string& application) {
    // It stands in the queue when it is about to wait, and has been refused its place when it comes back without.
    const auto isQueued = std::make_shared<std::atomic<bool>>(false);
    const auto announce = [isQueued] {
      *isQueued = true;
      isQueued->notify_all();
    };
    auto operation = std::make_shared<Operation>(announce, Intent{.accountTypeIdentifier = "type", .clientID = application});
    auto response = std::async(std::launch::async, [this, application, operation, announce] {
      const OperationScope scope(*operation);
      const auto handle =
          scheduler.createAlert(AlertAllocator::defaultAllocator, 0, AlertFlagsPlain, nullptr, titled(application));
      AlertResponse word = AlertResponseDefaultButton;
      scheduler.receiveResponse(handle, 0, word);
      scheduler.releaseAlert(handle);
      announce();
      return word;
    });
    isQueued->wait(false);
    return {.operation = operation, .response = std::move(response)};
  }

  // What an alert that the user answers like this comes to.
  AlertResponse answered(const std::string& application, AlertResponse answer) {
    const std::size_t next = screen.shown().size() + 1;
    Asking asking = ask(application);
    if (asking.operation->failure()) return asking.response.get();
    screen.waitForAlert(next);
    screen.answer(answer);
    return asking.response.get();
  }

  Screen screen;
  Notices log;
  AlertCoolDown::Clock::time_point now{std::chrono::hours(1)};
  AlertCoolDown coolDown{{.refusals = 3, .length = std::chrono::minutes(60)}, [this] { return now; }};
  AlertScheduler scheduler{screen, [this](const auto&) { screen.answer(AlertResponseNobody); }, coolDown, log};
};

TEST_F(Alerts, AreShownOneAtATimeInTheirOrder) {
  std::vector<Asking> asking;
  for (const char* application : {"first", "second", "third"}) asking.push_back(ask(application));
  for (std::size_t number = 1; number <= 3; ++number) {
    screen.waitForAlert(number);
    EXPECT_THAT(screen.shown(), SizeIs(number));
    screen.answer(AlertResponseDefaultButton);
    EXPECT_EQ(asking[number - 1].response.get(), AlertResponseDefaultButton);
  }
  EXPECT_THAT(screen.shown(), ElementsAre("first", "second", "third"));
}

TEST_F(Alerts, WaitInABoundedQueueAndTheNextOneIsToldSo) {
  std::vector<Asking> asking;
  for (std::size_t number = 0; number <= AlertScheduler::mostWaiting; ++number) asking.push_back(ask("waiting"));
  Asking late = ask("late");
  EXPECT_EQ(late.response.get(), AlertResponseNobody);
  ASSERT_TRUE(late.operation->failure());
  EXPECT_EQ(late.operation->failure()->kind(), BusFailureKind::notAsked);
  EXPECT_THAT(late.operation->failure()->what(), HasSubstr("8 questions wait for the user already"));
  EXPECT_FALSE(late.operation->wasUserAsked());
  EXPECT_FALSE(late.operation->isAnsweredByUser());

  for (std::size_t number = 0; number < asking.size(); ++number) {
    screen.waitForAlert(number + 1);
    screen.answer(AlertResponseAlternateButton);
    asking[number].response.get();
  }
  EXPECT_EQ(answered("late", AlertResponseDefaultButton), AlertResponseDefaultButton);
}

TEST_F(Alerts, LeaveTheQueueWhenTheirOperationIsWithdrawn) {
  Asking standing = ask("standing");
  screen.waitForAlert(1);
  Asking waiting = ask("waiting");
  waiting.operation->withdraw();
  EXPECT_EQ(waiting.response.get(), AlertResponseNobody);
  EXPECT_FALSE(waiting.operation->wasUserAsked());
  standing.operation->withdraw();
  EXPECT_EQ(standing.response.get(), AlertResponseNobody);
  EXPECT_TRUE(standing.operation->wasUserAsked());
  EXPECT_THAT(screen.shown(), ElementsAre("standing"));
}

TEST_F(Alerts, OfAnApplicationThatWasRefusedTooOftenAreNotShownForAWhile) {
  for (int time = 0; time < 3; ++time) {
    EXPECT_EQ(answered("photos", AlertResponseAlternateButton), AlertResponseAlternateButton);
  }
  EXPECT_THAT(log.messages, ElementsAre(AllOf(HasSubstr("photos"), HasSubstr("turned down too often"))));

  for (int time = 0; time < 100; ++time) {
    Asking asking = ask("photos");
    EXPECT_EQ(asking.response.get(), AlertResponseNobody);
    ASSERT_TRUE(asking.operation->failure());
    EXPECT_EQ(asking.operation->failure()->kind(), BusFailureKind::notAsked);
    EXPECT_THAT(asking.operation->failure()->what(), HasSubstr("Ask again in 60 minutes."));
    EXPECT_FALSE(asking.operation->wasUserAsked());
  }
  EXPECT_THAT(screen.shown(), SizeIs(3));
  EXPECT_THAT(log.messages, SizeIs(1)) << "one line a cool-down";
  EXPECT_EQ(answered("music", AlertResponseDefaultButton), AlertResponseDefaultButton);

  now += std::chrono::minutes(59);
  EXPECT_THAT(ask("photos").operation->failure()->what(), HasSubstr("Ask again in 1 minute."));
  now += std::chrono::minutes(1);
  EXPECT_EQ(answered("photos", AlertResponseDefaultButton), AlertResponseDefaultButton);
}

TEST_F(Alerts, AreRefusedByTheButtonAndByNothingElse) {
  for (const AlertResponse word : {AlertResponseNobody, AlertResponse{2}, AlertResponseNobody}) {
    EXPECT_EQ(answered("photos", word), AlertResponseNobody);
  }
  Asking withdrawn = ask("photos");
  screen.waitForAlert(4);
  withdrawn.operation->withdraw();
  withdrawn.response.get();
  screen.status = 5;
  EXPECT_EQ(answered("photos", AlertResponseAlternateButton), AlertResponseNobody);
  screen.status = 0;
  EXPECT_THAT(log.messages, IsEmpty());
  EXPECT_EQ(answered("photos", AlertResponseDefaultButton), AlertResponseDefaultButton);
}

TEST_F(Alerts, ThatComeAndGoWithoutEndAreNotShownForAWhile) {
  for (unsigned time = 0; time < 10; ++time) {
    Asking asking = ask("photos");
    screen.waitForAlert(time + 1);
    asking.operation->withdraw();
    asking.response.get();
  }
  EXPECT_THAT(log.messages, SizeIs(1));
  EXPECT_EQ(ask("photos").operation->failure()->kind(), BusFailureKind::notAsked);
}

TEST_F(Alerts, ThatALockTookDownAreNotCounted) {
  screen.status = ECANCELED;
  for (int time = 0; time < 100; ++time) EXPECT_EQ(answered("photos", AlertResponseNobody), AlertResponseNobody);
  screen.status = 0;
  EXPECT_THAT(log.messages, IsEmpty());
  EXPECT_EQ(answered("photos", AlertResponseDefaultButton), AlertResponseDefaultButton);
}

TEST_F(Alerts, ThatNobodyCouldSeeAreNotCounted) {
  screen.hasDisplay = false;
  for (int time = 0; time < 100; ++time) {
    Asking asking = ask("photos");
    EXPECT_EQ(asking.response.get(), AlertResponseNobody);
    EXPECT_FALSE(asking.operation->failure());
    EXPECT_FALSE(asking.operation->wasUserAsked());
  }
  screen.hasDisplay = true;
  EXPECT_EQ(answered("photos", AlertResponseDefaultButton), AlertResponseDefaultButton);
}

TEST_F(Alerts, OfNoApplicationInParticularAreShownAndNotCounted) {
  for (int time = 0; time < 4; ++time) {
    const auto handle = scheduler.createAlert(AlertAllocator::defaultAllocator, 0, AlertFlagsPlain, nullptr, titled("anybody"));
    auto refusal = std::async(std::launch::async, [&] { screen.answer(AlertResponseAlternateButton); });
    AlertResponse word = AlertResponseNobody;
    EXPECT_EQ(scheduler.receiveResponse(handle, 0, word), 0);
    EXPECT_EQ(word, AlertResponseAlternateButton);
  }
  EXPECT_THAT(screen.shown(), SizeIs(4));
}

}  // namespace
}  // namespace palisade
