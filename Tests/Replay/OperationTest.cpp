#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <future>
#include <memory>
#include <semaphore>

#include "Host/Json/Json.h"
#include "Testing/FakePlatform.h"

namespace palisade {
namespace {

using ::testing::AllOf;
using ::testing::ElementsAre;
using ::testing::Eq;
using ::testing::Field;
using ::testing::FieldsAre;

// Stands for a plug-in: what an operation does with the platform while `FakePlatform::run` carries it out.
class AnOperation : public ::testing::Test {
 protected:
  void ask(FacebookRequestHandler handler) {
    platform.social.makeFacebookPermissionDescriptionRequest(nullptr, std::nullopt)
        ->performRequestWithHandler(std::move(handler));
  }

  void noteFromHandler(const char* note) {
    ask([this, note](const auto&, const auto&, const auto&) { platform.trace.record(note); });
  }

  FakePlatform& platform = FakePlatform::create(std::make_shared<NlohmannJsonParser>());
};

constexpr const char* performed = "FacebookPermissionDescriptionRequest.performRequestWithHandler";

auto event(const char* name, const char* thread) {
  return AllOf(Field(&Event::name, Eq(name)), Field(&Event::thread, Eq(thread)));
}

TEST_F(AnOperation, RunsOnADaemonThreadAndReturns) {
  EXPECT_EQ(platform.run([this] { platform.trace.record("here"); }), OperationEnd::returned);
  EXPECT_THAT(platform.trace.events(), ElementsAre(event("here", "daemon")));
}

TEST_F(AnOperation, ThatWaitsGetsTheServersAnswerMeanwhile) {
  platform.social.descriptionAnswers = {{.data = "\"text\""}};
  const OperationEnd end = platform.run([this] {
    std::counting_semaphore<> answered(0);
    ask([&](const auto&, const auto&, const auto&) {
      platform.trace.record("answer");
      answered.release();
    });
    platform.trace.record("waiting");
    answered.acquire();
    platform.trace.record("woken");
  });
  EXPECT_EQ(end, OperationEnd::returned);
  EXPECT_THAT(platform.trace.events(),
              ElementsAre(event("FacebookPermissionDescriptionRequest.init", "daemon"), event(performed, "daemon"),
                          event("waiting", "daemon"), event("answer", "request"), event("woken", "daemon")));
}

TEST_F(AnOperation, ThatReturnsGetsTheServersAnswersAfterwardsInOrder) {
  platform.run([this] {
    noteFromHandler("first");
    noteFromHandler("second");
    platform.trace.record("returning");
  });
  const auto events = platform.trace.events();
  ASSERT_EQ(events.size(), 7u);
  EXPECT_THAT(std::vector(events.end() - 3, events.end()),
              ElementsAre(event("returning", "daemon"), event("first", "request"), event("second", "request")));
}

TEST_F(AnOperation, GetsAnAnswerInLineBeforeItGoesOn) {
  platform.social.descriptionAnswers = {{.delivery = Delivery::inLine}};
  platform.run([this] {
    noteFromHandler("answer");
    platform.trace.record("after");
  });
  const auto events = platform.trace.events();
  EXPECT_THAT(std::vector(events.end() - 2, events.end()), ElementsAre(event("answer", "daemon"), event("after", "daemon")));
}

TEST_F(AnOperation, ThatWaitsForAnAnswerThatNeverComesIsLeftWaiting) {
  platform.social.descriptionAnswers = {{.delivery = Delivery::never}};
  const auto wait = [this] {
    auto answered = std::make_shared<std::promise<void>>();
    ask([answered](const auto&, const auto&, const auto&) { answered->set_value(); });
    answered->get_future().wait();
  };
  EXPECT_EQ(platform.run(wait), OperationEnd::waitsForSemaphore);
  EXPECT_EQ(platform.run([] {}), OperationEnd::returned) << "the next one runs all the same";
}

TEST_F(AnOperation, ThatWaitsForAUserWhoNeverAnswersIsLeftWaiting) {
  platform.alert.answers = {userNeverAnswers()};
  const auto wait = [this] {
    AlertResponse word = AlertResponseNobody;
    platform.alert.receiveResponse(platform.alert.createAlert(AlertAllocator::defaultAllocator, 0, 0, nullptr, {}), 0, word);
  };
  EXPECT_EQ(platform.run(wait), OperationEnd::waitsForAlert);
}

TEST_F(AnOperation, SeesItsHandlerCalledTwice) {
  platform.social.descriptionAnswers = {{.delivery = Delivery::twice}};
  platform.run([this] { noteFromHandler("answer"); });
  EXPECT_THAT(platform.trace.named("answer").size(), Eq(2u));
}

TEST_F(AnOperation, SeesADroppedHandlerDestroyed) {
  platform.social.descriptionAnswers = {{.delivery = Delivery::dropped}};
  auto held = std::make_shared<int>(1);
  const std::weak_ptr<int> watched = held;
  platform.run([this, held = std::move(held)]() mutable {
    ask([held = std::move(held)](const auto&, const auto&, const auto&) { FAIL() << "a dropped handler was called"; });
  });
  EXPECT_TRUE(watched.expired());
}

TEST_F(AnOperation, SeesANeverCalledHandlerKeptAlive) {
  platform.social.descriptionAnswers = {{.delivery = Delivery::never}};
  auto held = std::make_shared<int>(1);
  const std::weak_ptr<int> watched = held;
  platform.run(
      [this, held = std::move(held)]() mutable { ask([held = std::move(held)](const auto&, const auto&, const auto&) {}); });
  EXPECT_FALSE(watched.expired());
}

TEST_F(AnOperation, IsNotTakenForWaitingWhileAQueueWorks) {
  // Many rounds, because a false alarm would need an unlucky moment.
  const auto queue = platform.queues.makeSerialQueue("q");
  for (int round = 0; round < 200; ++round) {
    int steps = 0;
    ASSERT_EQ(platform.run([&] {
      for (int step = 0; step < 10; ++step) queue->sync([&] { ++steps; });
    }),
              OperationEnd::returned);
    ASSERT_EQ(steps, 10);
  }
}

TEST_F(AnOperation, ThatWaitsForItsOwnQueueIsLeftWaiting) {
  const auto queue = platform.queues.makeSerialQueue("q");
  EXPECT_EQ(platform.run([queue] { queue->sync([queue] { queue->sync([] {}); }); }), OperationEnd::waitsForSemaphore);
}

TEST_F(AnOperation, IsNotTakenForWaitingWhileAQueueStartsOrEnds) {
  for (int round = 0; round < 200; ++round) {
    ASSERT_EQ(platform.run([this] { platform.queues.makeSerialQueue("q")->async([] {}); }), OperationEnd::returned);
  }
}

TEST_F(AnOperation, ThatWokeAnEarlierOneWaitsForItToRest) {
  const auto wakeUp = std::make_shared<std::counting_semaphore<>>(0);
  const auto wait = [this, wakeUp] {
    wakeUp->acquire();
    platform.trace.record("woken");
  };
  EXPECT_EQ(platform.run(wait), OperationEnd::waitsForSemaphore);
  EXPECT_EQ(platform.run([wakeUp] { wakeUp->release(); }), OperationEnd::returned);
  EXPECT_THAT(platform.trace.names(), ElementsAre("woken"));
}

TEST_F(AnOperation, HasReturnedOnlyWhenTheQueuesHaveDoneWhatItLeftThem) {
  const auto queue = platform.queues.makeSerialQueue("q");
  platform.run([&] {
    for (int note = 0; note < 100; ++note) queue->async([this] { platform.trace.record("note"); });
  });
  EXPECT_EQ(platform.trace.named("note").size(), 100u);
}

TEST_F(AnOperation, RemembersWhatItsCompletionWasCalledWith) {
  const Error error{.domain = "org.example", .code = 3};
  platform.run([&] { platform.completion(4)(false, error); });
  EXPECT_THAT(platform.completions(), ElementsAre(FieldsAre(false, std::optional(error))));
  EXPECT_THAT(platform.trace.events(), ElementsAre(event("completion", "daemon")));
  EXPECT_EQ(platform.trace.events()[0]["operation"], Value(4));
}

TEST_F(AnOperation, OnAThreadOfTheTestsOwnGetsItsAnswersAutomatically) {
  platform.deliveries.deliverAutomatically();
  for (int round = 0; round < 3; ++round) {
    std::promise<void> answered;
    ask([&](const auto&, const auto&, const auto&) { answered.set_value(); });
    answered.get_future().wait();
  }
}

TEST_F(AnOperation, OnAThreadOfTheTestsOwnGetsItsAnswersWhenTheTestSaysSo) {
  noteFromHandler("answer");
  EXPECT_EQ(platform.deliveries.pending(), 1u);
  EXPECT_TRUE(platform.deliveries.deliverNext());
  EXPECT_THAT(platform.trace.named("answer"), ElementsAre(event("answer", "request")));
  EXPECT_FALSE(platform.deliveries.deliverNext());
}

}  // namespace
}  // namespace palisade
