#include "Host/Bus/WaitingCalls.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <future>
#include <string>
#include <thread>
#include <vector>

#include "Host/Bus/AccountsService.h"

namespace palisade {
namespace {

using testing::Each;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::SizeIs;
using testing::ThrowsMessage;

constexpr std::size_t mostInLine = 10;

// A call that has begun on a thread of its own, and goes on when it is told to.
class StandingCall {
 public:
  StandingCall(WaitingCalls& calls, const std::string& line)
      : _thread([this, &calls, line] {
          calls.run(line, [this] {
            _begun.set_value();
            _mayEnd.get_future().wait();
          });
        }),
        _id(_thread.get_id()) {
    _begun.get_future().wait();
  }
  std::thread::id thread() const { return _id; }
  void end() {
    _mayEnd.set_value();
    _thread.join();
  }

 private:
  std::promise<void> _begun;
  std::promise<void> _mayEnd;
  std::jthread _thread;
  std::thread::id _id;
};

TEST(AWaitingCall, RunsAtOnceWhereNoneIsBeforeIt) {
  WaitingCalls calls(1, mostInLine);
  std::vector<int> run;
  calls.run("photos", [&] { run.push_back(1); });
  calls.run("photos", [&] { run.push_back(2); });
  EXPECT_THAT(run, ElementsAre(1, 2));
}

TEST(AWaitingCall, HoldsNoThreadUntilItsTurnAndThenThatOfTheOneBeforeIt) {
  WaitingCalls calls(1, mostInLine);
  StandingCall standing(calls, "photos");
  std::vector<std::thread::id> threads;
  for (int call = 0; call < 3; ++call) calls.run("photos", [&] { threads.push_back(std::this_thread::get_id()); });
  standing.end();
  EXPECT_THAT(threads, SizeIs(3));
  EXPECT_THAT(threads, Each(standing.thread()));
}

TEST(AWaitingCall, RunsBesideAFewOthersOfItsLine) {
  WaitingCalls calls(2, mostInLine);
  StandingCall standing(calls, "photos");
  bool hasRun = false;
  calls.run("photos", [&] { hasRun = true; });
  EXPECT_TRUE(hasRun);
  standing.end();
}

TEST(AWaitingCall, DoesNotWaitForThoseOfAnotherLine) {
  WaitingCalls calls(1, mostInLine);
  StandingCall standing(calls, "photos");
  bool hasRun = false;
  calls.run("album", [&] { hasRun = true; });
  EXPECT_TRUE(hasRun);
  standing.end();
}

TEST(AWaitingCall, IsRefusedWhenItsLineIsFull) {
  WaitingCalls calls(1, mostInLine);
  StandingCall standing(calls, "photos");
  std::size_t run = 0;
  for (std::size_t call = 0; call < mostInLine; ++call) calls.run("photos", [&] { ++run; });
  EXPECT_THAT([&] { calls.run("photos", [] {}); }, ThrowsMessage<BusFailure>(HasSubstr("10 unanswered calls")));
  calls.run("album", [&] { ++run; });
  standing.end();
  EXPECT_EQ(run, mostInLine + 1);
  calls.run("photos", [&] { ++run; });
  EXPECT_EQ(run, mostInLine + 2) << "the line is free again";
}

}  // namespace
}  // namespace palisade
