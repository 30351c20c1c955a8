#include "Host/Queue/ThreadSerialQueue.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <pthread.h>

#include <algorithm>
#include <atomic>
#include <future>
#include <numeric>
#include <optional>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

namespace palisade {
namespace {

constexpr std::string_view label = "com.example.palisade.work";

std::string nameOfThisThread() {
  char name[16] = {};
  pthread_getname_np(pthread_self(), name, sizeof name);
  return name;
}

TEST(ASerialQueue, RunsItsWorkInTheOrderOfArrival) {
  constexpr int pieces = 1000;
  std::vector<int> seen;
  ThreadSerialQueue queue(label);
  for (int piece = 0; piece < pieces; ++piece) queue.async([&seen, piece] { seen.push_back(piece); });
  queue.sync([] {});

  std::vector<int> expected(pieces);
  std::iota(expected.begin(), expected.end(), 0);
  EXPECT_EQ(seen, expected);
}

TEST(ASerialQueue, SaysWhenSomebodyIsAboutToWaitForIt) {
  int announced = 0;
  ThreadSerialQueueFactory queues([&] { ++announced; });
  const auto queue = queues.makeSerialQueue(label);
  queue->async([] {});
  EXPECT_EQ(announced, 0);
  queue->sync([&] { EXPECT_EQ(announced, 1); });
  EXPECT_EQ(announced, 1);
}

TEST(ASerialQueue, RunsOnePieceAtATimeWhoeverHandsItIn) {
  constexpr int callers = 4;
  constexpr int pieces = 200;
  std::atomic<int> running = 0;
  std::atomic<int> most = 0;
  // Not atomic: what the queue promises is all that keeps it whole.
  int finished = 0;
  {
    ThreadSerialQueue queue(label);
    const auto work = [&] {
      most = std::max(most.load(), ++running);
      ++finished;
      --running;
    };
    std::vector<std::jthread> threads;
    for (int caller = 0; caller < callers; ++caller) {
      threads.emplace_back([&] {
        for (int piece = 0; piece < pieces; ++piece) queue.async(work);
        queue.sync(work);
      });
    }
  }
  EXPECT_EQ(most, 1);
  EXPECT_EQ(finished, callers * (pieces + 1));
}

std::thread::id threadOfAsynchronousWork(ThreadSerialQueue& queue) {
  std::promise<std::thread::id> thread;
  queue.async([&] { thread.set_value(std::this_thread::get_id()); });
  return thread.get_future().get();
}

TEST(ASerialQueue, RunsAsynchronousWorkOnOneThreadOfItsOwn) {
  ThreadSerialQueue queue(label);
  const std::thread::id first = threadOfAsynchronousWork(queue);
  EXPECT_EQ(threadOfAsynchronousWork(queue), first);
  EXPECT_NE(first, std::this_thread::get_id());
}

TEST(ASerialQueue, RunsSynchronousWorkOnTheCallersThreadWhenNothingIsBeforeIt) {
  ThreadSerialQueue queue(label);
  std::thread::id thread;
  queue.sync([&] { thread = std::this_thread::get_id(); });
  EXPECT_EQ(thread, std::this_thread::get_id());
}

TEST(ASerialQueue, RunsAsynchronousWorkAfterTheSynchronousWorkThatItCameDuring) {
  ThreadSerialQueue queue(label);
  std::vector<std::string> seen;
  queue.sync([&] {
    queue.async([&] { seen.emplace_back("asynchronous"); });
    seen.emplace_back("synchronous");
  });
  queue.sync([] {});
  EXPECT_THAT(seen, testing::ElementsAre("synchronous", "asynchronous"));
}

TEST(ASerialQueue, DoesNotHoldUpAnotherQueue) {
  ThreadSerialQueue stuck(label);
  ThreadSerialQueue free("com.example.palisade.free");
  std::promise<void> release;
  stuck.async([&] { release.get_future().wait(); });
  free.sync([&] { release.set_value(); });
  stuck.sync([] {});
}

TEST(ASerialQueue, TakesWorkFromItselfAndRunsItAfterWhatWaits) {
  std::vector<std::string> seen;
  std::promise<void> bothAreWaiting;
  std::promise<void> last;
  ThreadSerialQueue queue(label);
  queue.async([&] {
    bothAreWaiting.get_future().wait();
    queue.async([&] {
      seen.emplace_back("handed in by the first");
      last.set_value();
    });
    seen.emplace_back("first");
  });
  queue.async([&] { seen.emplace_back("second"); });
  bothAreWaiting.set_value();
  last.get_future().wait();
  EXPECT_THAT(seen, testing::ElementsAre("first", "second", "handed in by the first"));
}

TEST(ASerialQueue, HasRunSynchronousWorkWhenItReturns) {
  ThreadSerialQueue queue(label);
  bool hasRun = false;
  queue.sync([&] { hasRun = true; });
  EXPECT_TRUE(hasRun);
}

TEST(ASerialQueue, HandsAnExceptionOfSynchronousWorkToItsCallerAndWorksOn) {
  ThreadSerialQueue queue(label);
  EXPECT_THAT([&] { queue.sync([] { throw std::runtime_error("No."); }); }, testing::ThrowsMessage<std::runtime_error>("No."));
  bool hasRun = false;
  queue.sync([&] { hasRun = true; });
  EXPECT_TRUE(hasRun);
}

TEST(ASerialQueue, RunsWhatItWasGivenBeforeItEnds) {
  int finished = 0;
  std::promise<void> release;
  std::optional<ThreadSerialQueue> queue(std::in_place, label);
  queue->async([&] { release.get_future().wait(); });
  for (int piece = 0; piece < 10; ++piece) queue->async([&] { ++finished; });
  queue->async([&, &sameQueue = *queue] { sameQueue.async([&] { ++finished; }); });
  release.set_value();
  queue.reset();
  EXPECT_EQ(finished, 11);
}

TEST(ASerialQueue, NamesItsThreadAfterTheLastElementOfItsLabel) {
  struct Case {
    std::string label;
    std::string thread;
  };
  for (const auto& [name, expected] : std::vector<Case>{{"com.example.palisade.work", "work"},
                                                        {"work", "work"},
                                                        {"com.example.aNameOfTooManyCharacters", "aNameOfTooManyC"}}) {
    std::promise<std::string> seen;
    ThreadSerialQueueFactory factory;
    const std::shared_ptr<SerialQueue> queue = factory.makeSerialQueue(name);
    queue->async([&] { seen.set_value(nameOfThisThread()); });
    EXPECT_EQ(seen.get_future().get(), expected);
    EXPECT_EQ(queue->label(), name);
  }
}

}  // namespace
}  // namespace palisade
