#include <gtest/gtest.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <unistd.h>

#include <chrono>
#include <cstdlib>
#include <exception>
#include <fstream>
#include <future>
#include <iostream>
#include <iterator>
#include <string>
#include <thread>

#include "Testing/EndlessWait.h"

namespace palisade {
namespace {

// Root may open every file in /proc, so the tests become somebody else.
void becomeAnOrdinaryUser() {
  if (geteuid() == 0 && setresuid(65534, 65534, 65534) != 0) std::_Exit(3);
  // A process that changed its user is closed to itself as well, unless it says otherwise.
  prctl(PR_SET_DUMPABLE, 1);
}

bool isInState(pid_t thread, char state) {
  std::ifstream file("/proc/self/task/" + std::to_string(thread) + "/stat");
  std::string line((std::istreambuf_iterator<char>(file)), {});
  return line.find(std::string(") ") + state) != std::string::npos;
}

void awaitState(pid_t thread, char state) {
  while (!isInState(thread, state)) std::this_thread::yield();
}

// Ends the process, whichever of its threads this is.
[[noreturn]] void say(const std::string& sentence) {
  std::cerr << sentence << std::endl;
  std::_Exit(0);
}

std::string waitOf(pid_t thread) {
  try {
    return endlessWaitOf(thread) ? "waits" : "does not wait";
  } catch (const std::exception& error) {
    return error.what();
  }
}

// In a process of its own, which no other test has started threads in.
class AThread : public ::testing::Test {
 protected:
  void SetUp() override { GTEST_FLAG_SET(death_test_style, "threadsafe"); }
};

// A process's first thread that has ended before the others keeps its place in /proc, and has given its memory back: what every
// thread is for a moment when it ends.
void askAboutAnEndingThread() {
  becomeAnOrdinaryUser();
  const pid_t first = gettid();
  std::thread([first] {
    awaitState(first, 'Z');
    say(waitOf(first));
  }).detach();
  // Ends this thread alone, without unwinding through the test framework.
  syscall(SYS_exit, 0);
}

void askAboutAThreadThatIsGone() {
  becomeAnOrdinaryUser();
  std::promise<pid_t> number;
  std::thread([&] { number.set_value(gettid()); }).join();
  say(waitOf(number.get_future().get()));
}

void askAboutASleepingThread(void (*sleep)()) {
  becomeAnOrdinaryUser();
  std::promise<pid_t> number;
  std::thread([&] {
    number.set_value(gettid());
    sleep();
  }).detach();
  const pid_t thread = number.get_future().get();
  awaitState(thread, 'S');
  say(waitOf(thread));
}

void askInAProcessThatIsClosedToItself() {
  becomeAnOrdinaryUser();
  prctl(PR_SET_DUMPABLE, 0);
  say(waitOf(gettid()));
}

TEST_F(AThread, ThatEndsDoesNotWait) { EXPECT_EXIT(askAboutAnEndingThread(), ::testing::ExitedWithCode(0), "^does not wait"); }

TEST_F(AThread, ThatIsGoneDoesNotWait) {
  EXPECT_EXIT(askAboutAThreadThatIsGone(), ::testing::ExitedWithCode(0), "^does not wait");
}

TEST_F(AThread, ThatOnlyAnotherOneCanWakeWaits) {
  EXPECT_EXIT(askAboutASleepingThread([] { std::promise<void>().get_future().wait(); }), ::testing::ExitedWithCode(0),
              "^waits");
}

TEST_F(AThread, WhoseTimeRunsOutDoesNotWait) {
  EXPECT_EXIT(askAboutASleepingThread([] { std::promise<void>().get_future().wait_for(std::chrono::hours(1)); }),
              ::testing::ExitedWithCode(0), "^does not wait");
}

TEST_F(AThread, OfAProcessThatIsClosedToItselfCannotBeToldAbout) {
  EXPECT_EXIT(askInAProcessThatIsClosedToItself(), ::testing::ExitedWithCode(0),
              "^Cannot tell whether a thread waits: /proc/thread-self/syscall cannot be opened: Permission denied");
}

}  // namespace
}  // namespace palisade
