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
using Bound = ClientLanes::Bound;
using HeldTurn = std::unique_ptr<ClientLanes::Turn>;

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

// A thread that asks for a turn, notes it and leaves.
class Caller {
 public:
  template <typename Enter>
  Caller(const std::string& name, Turns& turns, Enter enter)
      : _thread([this, name, &turns, enter] {
          const auto turn = enter([this] {
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
  HeldTurn hold(const std::string& client, Bound bound = Bound::kept) {
    return HeldTurn(
        new ClientLanes::Turn(lanes.enter(client, bound, [] { ADD_FAILURE() << "There is nothing to wait for."; })));
  }
  HeldTurn holdAll() {
    return HeldTurn(new ClientLanes::Turn(lanes.enterAll([] { ADD_FAILURE() << "There is nothing to wait for."; })));
  }
  // Both return when the caller waits.
  std::unique_ptr<Caller> queueUp(const std::string& name, const std::string& client, Bound bound = Bound::kept) {
    auto caller = std::make_unique<Caller>(
        name, turns, [this, client, bound](const auto& beforeWaiting) { return lanes.enter(client, bound, beforeWaiting); });
    caller->waitUntilItWaits();
    return caller;
  }
  std::unique_ptr<Caller> queueUpForAll(const std::string& name) {
    auto caller =
        std::make_unique<Caller>(name, turns, [this](const auto& beforeWaiting) { return lanes.enterAll(beforeWaiting); });
    caller->waitUntilItWaits();
    return caller;
  }

  Turns turns;
  ClientLanes lanes{3};
};

TEST_F(Lanes, AreFreeAsSoonAsATurnIsEnded) {
  const HeldTurn ended = hold("photos");
  ended->end();
  EXPECT_NE(hold("photos"), nullptr) << "and it does not end twice";
  ended->end();
  EXPECT_NE(hold("photos"), nullptr);
}

TEST_F(Lanes, GiveATurnAtOnceWhereNobodyIsInTheWay) {
  hold("editor");
  hold("editor");
  holdAll();
  hold("editor");
}

TEST_F(Lanes, LetOtherClientsRunBesideAClient) {
  const HeldTurn editor = hold("editor");
  const HeldTurn viewer = hold("viewer");
}

TEST_F(Lanes, KeepAClientsOperationsInOrder) {
  HeldTurn first = hold("editor");
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
  for (int thread = 0; thread < 4; ++thread) {
    threads.emplace_back([&] {
      for (int operation = 0; operation < 100; ++operation) {
        const auto turn = lanes.enter("editor", Bound::waived, [] {});
        most = std::max(most.load(), ++running);
        --running;
      }
    });
  }
  threads.clear();
  EXPECT_EQ(most, 1);
}

TEST_F(Lanes, RefuseAClientWithTooManyOperations) {
  HeldTurn first = hold("editor");
  const auto second = queueUp("second", "editor");
  const auto third = queueUp("third", "editor");
  EXPECT_THAT([&] { static_cast<void>(lanes.enter("editor", Bound::kept, [] {})); },
              ThrowsMessage<LaneIsFull>(HasSubstr("3 unanswered requests")));
  hold("viewer");

  first.reset();
  second->waitUntilItHasLeft();
  third->waitUntilItHasLeft();
  hold("editor");
}

TEST_F(Lanes, NeverRefuseWhereTheBoundIsWaived) {
  HeldTurn first = hold("editor");
  const auto second = queueUp("second", "editor");
  const auto third = queueUp("third", "editor");
  const auto revocation = queueUp("revocation", "editor", Bound::waived);
  EXPECT_THROW(static_cast<void>(lanes.enter("editor", Bound::kept, [] {})), LaneIsFull);
  first.reset();
  revocation->waitUntilItHasLeft();
  EXPECT_THAT(turns.names(), ElementsAre("second", "third", "revocation"));
}

TEST_F(Lanes, GiveEverybodysTurnWhenAllTurnsHaveEnded) {
  HeldTurn editor = hold("editor");
  HeldTurn viewer = hold("viewer");
  const auto all = queueUpForAll("all");
  editor.reset();
  EXPECT_THAT(turns.names(), IsEmpty());
  viewer.reset();
  all->waitUntilItHasLeft();
  EXPECT_THAT(turns.names(), ElementsAre("all"));
}

TEST_F(Lanes, BeginNoTurnBesideEverybodys) {
  HeldTurn all = holdAll();
  const auto editor = queueUp("editor", "editor");
  const auto viewer = queueUp("viewer", "viewer", Bound::waived);
  const auto another = queueUpForAll("another");
  EXPECT_THAT(turns.names(), IsEmpty());
  all.reset();
  editor->waitUntilItHasLeft();
  viewer->waitUntilItHasLeft();
  another->waitUntilItHasLeft();
  EXPECT_THAT(turns.names(), UnorderedElementsAre("editor", "viewer", "another"));
}

TEST_F(Lanes, BeginNoTurnWhileSomebodyWaitsForEverybodys) {
  HeldTurn editor = hold("editor");
  const auto all = queueUpForAll("all");
  const auto viewer = queueUp("viewer", "viewer");
  const auto next = queueUp("next", "editor");
  editor.reset();
  viewer->waitUntilItHasLeft();
  next->waitUntilItHasLeft();
  EXPECT_EQ(turns.names().front(), "all");
}

TEST_F(Lanes, GoOnWithoutAnOperationThatCannotAnnounceItsWait) {
  const std::function<void()> fail = [] { throw std::runtime_error("The caller is gone."); };
  HeldTurn first = hold("editor");
  const auto second = queueUp("second", "editor");
  EXPECT_THROW(static_cast<void>(lanes.enter("editor", Bound::kept, fail)), std::runtime_error);
  const auto third = queueUp("third", "editor");
  EXPECT_THROW(static_cast<void>(lanes.enterAll(fail)), std::runtime_error);
  hold("viewer");

  first.reset();
  second->waitUntilItHasLeft();
  third->waitUntilItHasLeft();
  EXPECT_THAT(turns.names(), ElementsAre("second", "third"));
  holdAll();
}

}  // namespace
}  // namespace palisade
