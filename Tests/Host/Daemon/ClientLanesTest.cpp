#include "Host/Daemon/ClientLanes.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <functional>
#include <memory>
#include <mutex>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

namespace palisade {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::ThrowsMessage;
using testing::UnorderedElementsAre;
using Place = std::unique_ptr<ClientLanes::Place>;

// Who had a turn, in order.
class Turns {
 public:
  void add(const std::string& name) {
    const std::lock_guard lock(_mutex);
    _names.push_back(name);
  }
  std::vector<std::string> names() {
    const std::lock_guard lock(_mutex);
    return _names;
  }

 private:
  std::mutex _mutex;
  std::vector<std::string> _names;
};

// A thread that asks for a place, notes it and leaves.
class Caller {
 public:
  template <typename Enter>
  Caller(const std::string& name, Turns& turns, Enter enter)
      : _thread([this, name, &turns, enter] {
          const auto place = enter([this] {
            ++_waits;
            _waits.notify_all();
          });
          turns.add(name);
        }) {}

  void waitUntilItWaits() { _waits.wait(0); }
  void waitUntilItHasLeft() { _thread.join(); }

 private:
  std::atomic<int> _waits = 0;
  std::jthread _thread;
};

class Lanes : public testing::Test {
 protected:
  Place turn(const std::string& client) {
    return Place(new ClientLanes::Place(lanes.enter(client, [] { ADD_FAILURE() << "There is nothing to wait for."; })));
  }
  Place hold(const std::string& client) { return Place(new ClientLanes::Place(lanes.hold(client))); }
  Place holdAll() { return Place(new ClientLanes::Place(lanes.holdAll())); }
  // Returns when the caller waits.
  std::unique_ptr<Caller> queueUp(const std::string& name, const std::string& client) {
    auto caller = std::make_unique<Caller>(
        name, turns, [this, client](const auto& beforeWaiting) { return lanes.enter(client, beforeWaiting); });
    caller->waitUntilItWaits();
    return caller;
  }

  Turns turns;
  ClientLanes lanes{3};
};

TEST_F(Lanes, AreFreeAsSoonAsATurnIsEnded) {
  const Place ended = turn("photos");
  ended->end();
  EXPECT_NE(turn("photos"), nullptr) << "and it does not end twice";
  ended->end();
  EXPECT_NE(turn("photos"), nullptr);
}

TEST_F(Lanes, GiveATurnAtOnceWhereNobodyIsInTheWay) {
  turn("editor");
  turn("editor");
  holdAll();
  hold("editor");
  turn("editor");
}

TEST_F(Lanes, LetOtherClientsRunBesideAClient) {
  const Place editor = turn("editor");
  const Place viewer = turn("viewer");
}

TEST_F(Lanes, KeepAClientsOperationsInOrder) {
  Place first = turn("editor");
  const auto second = queueUp("second", "editor");
  const auto third = queueUp("third", "editor");
  EXPECT_THAT(turns.names(), IsEmpty());
  first.reset();
  second->waitUntilItHasLeft();
  third->waitUntilItHasLeft();
  EXPECT_THAT(turns.names(), ElementsAre("second", "third"));
}

TEST_F(Lanes, RunAClientsOperationsOneAtATime) {
  std::atomic<int> running = 0;
  std::atomic<int> most = 0;
  std::vector<std::jthread> threads;
  for (int thread = 0; thread < 3; ++thread) {
    threads.emplace_back([&] {
      for (int operation = 0; operation < 100; ++operation) {
        const auto turn = lanes.enter("editor", [] {});
        most = std::max(most.load(), ++running);
        --running;
      }
    });
  }
  threads.clear();
  EXPECT_EQ(most, 1);
}

TEST_F(Lanes, RefuseAClientWithTooManyOperations) {
  Place first = turn("editor");
  const auto second = queueUp("second", "editor");
  const auto third = queueUp("third", "editor");
  EXPECT_THAT([&] { static_cast<void>(lanes.enter("editor", [] {})); },
              ThrowsMessage<LaneIsFull>(HasSubstr("3 unanswered requests")));
  turn("viewer");

  first.reset();
  second->waitUntilItHasLeft();
  third->waitUntilItHasLeft();
  turn("editor");
}

TEST_F(Lanes, AreHeldAtOnceWhateverRunsOrWaitsInThem) {
  Place first = turn("editor");
  const auto second = queueUp("second", "editor");
  Place held = hold("editor");
  held.reset();
  held = holdAll();
  held.reset();
  first.reset();
  second->waitUntilItHasLeft();
}

TEST_F(Lanes, LetNoOperationBeginWhileTheyAreHeld) {
  Place first = turn("editor");
  const auto second = queueUp("second", "editor");
  Place held = hold("editor");
  first.reset();
  const auto third = queueUp("third", "editor");
  turn("viewer");
  EXPECT_THAT(turns.names(), IsEmpty());
  held.reset();
  second->waitUntilItHasLeft();
  third->waitUntilItHasLeft();
  EXPECT_THAT(turns.names(), ElementsAre("second", "third"));
}

TEST_F(Lanes, LetNobodysOperationBeginWhileAllAreHeld) {
  Place held = holdAll();
  const auto editor = queueUp("editor", "editor");
  const auto viewer = queueUp("viewer", "viewer");
  EXPECT_THAT(turns.names(), IsEmpty());
  held.reset();
  editor->waitUntilItHasLeft();
  viewer->waitUntilItHasLeft();
  EXPECT_THAT(turns.names(), UnorderedElementsAre("editor", "viewer"));
}

TEST_F(Lanes, AreHeldByOneAtATime) {
  std::atomic<int> holders = 0;
  std::atomic<int> most = 0;
  std::vector<std::jthread> threads;
  for (int thread = 0; thread < 4; ++thread) {
    threads.emplace_back([&, holdsAll = thread % 2 == 0] {
      for (int round = 0; round < 100; ++round) {
        const auto held = holdsAll ? lanes.holdAll() : lanes.hold("editor");
        most = std::max(most.load(), ++holders);
        --holders;
      }
    });
  }
  threads.clear();
  EXPECT_EQ(most, 1);
}

TEST_F(Lanes, GoOnWithoutAnOperationThatCannotAnnounceItsWait) {
  const std::function<void()> fail = [] { throw std::runtime_error("The caller is gone."); };
  Place first = turn("editor");
  const auto second = queueUp("second", "editor");
  EXPECT_THROW(static_cast<void>(lanes.enter("editor", fail)), std::runtime_error);
  const auto third = queueUp("third", "editor");
  turn("viewer");

  first.reset();
  second->waitUntilItHasLeft();
  third->waitUntilItHasLeft();
  EXPECT_THAT(turns.names(), ElementsAre("second", "third"));
}

}  // namespace
}  // namespace palisade
