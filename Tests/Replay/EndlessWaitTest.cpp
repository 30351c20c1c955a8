#include <gtest/gtest.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <chrono>
#include <cstdlib>
#include <exception>
#include <fstream>
#include <future>
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

// What a process of its own writes, in which `carryOut` runs.
std::string answerOf(void (*carryOut)(int answers)) {
  std::array<int, 2> ends{};
  if (pipe(ends.data()) != 0) return "no pipe";
  const pid_t process = fork();
  if (process == 0) {
    close(ends[0]);
    becomeAnOrdinaryUser();
    carryOut(ends[1]);
    std::_Exit(4);
  }
  close(ends[1]);
  std::string answer;
  char next = 0;
  while (read(ends[0], &next, 1) == 1) answer += next;
  close(ends[0]);
  waitpid(process, nullptr, 0);
  return answer;
}

[[noreturn]] void answer(int answers, const std::string& text) {
  std::_Exit(write(answers, text.data(), text.size()) < 0 ? 1 : 0);
}

std::string waitOf(pid_t thread) {
  try {
    return endlessWaitOf(thread) ? "waits" : "does not wait";
  } catch (const std::exception& error) {
    return error.what();
  }
}

// A process's first thread that has ended before the others keeps its place in /proc, and has given its memory back: what every
// thread is for a moment when it ends.
TEST(AnEndingThread, DoesNotWait) {
  EXPECT_EQ(answerOf([](int answers) {
              const pid_t first = gettid();
              std::thread([answers, first] {
                awaitState(first, 'Z');
                answer(answers, waitOf(first));
              }).detach();
              // Ends this thread alone, without unwinding through the test framework.
              syscall(SYS_exit, 0);
            }),
            "does not wait");
}

TEST(AThreadThatIsGone, DoesNotWait) {
  EXPECT_EQ(answerOf([](int answers) {
              std::promise<pid_t> number;
              std::thread([&] { number.set_value(gettid()); }).join();
              answer(answers, waitOf(number.get_future().get()));
            }),
            "does not wait");
}

TEST(ASleepingThread, WaitsWhenNothingButAnotherOneCanWakeIt) {
  EXPECT_EQ(answerOf([](int answers) {
              std::promise<pid_t> number;
              std::thread([&] {
                number.set_value(gettid());
                std::promise<void>().get_future().wait();
              }).detach();
              const pid_t thread = number.get_future().get();
              awaitState(thread, 'S');
              answer(answers, waitOf(thread));
            }),
            "waits");
}

TEST(ASleepingThread, DoesNotWaitWhenItsTimeRunsOut) {
  EXPECT_EQ(answerOf([](int answers) {
              std::promise<pid_t> number;
              std::thread([&] {
                number.set_value(gettid());
                std::promise<void>().get_future().wait_for(std::chrono::hours(1));
              }).detach();
              const pid_t thread = number.get_future().get();
              awaitState(thread, 'S');
              answer(answers, waitOf(thread));
            }),
            "does not wait");
}

TEST(AProcessThatMayNotLookAtItself, SaysSo) {
  EXPECT_EQ(answerOf([](int answers) {
              prctl(PR_SET_DUMPABLE, 0);
              answer(answers, waitOf(gettid()));
            }),
            "Cannot tell whether a thread waits: /proc/thread-self/syscall cannot be opened: Permission denied.");
}

}  // namespace
}  // namespace palisade
