#include "Host/Daemon/Operation.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <functional>
#include <memory>
#include <thread>

namespace palisade {
namespace {

using testing::MockFunction;

TEST(AnOperation, AnnouncesItsFirstWaitOnce) {
  MockFunction<void()> announce;
  EXPECT_CALL(announce, Call).Times(1);
  Operation operation(announce.AsStdFunction());
  operation.aboutToWait();
  operation.aboutToWait();
}

TEST(AnOperation, HasFailedWhenItsFirstWaitCannotBeAnnounced) {
  Operation operation([] { throw BusFailure(BusFailureKind::tooManyRequests, "There is no thread left."); });
  EXPECT_THROW(operation.aboutToWait(), BusFailure);
  ASSERT_TRUE(operation.failure());
  EXPECT_EQ(operation.failure()->kind(), BusFailureKind::tooManyRequests);
}

TEST(AnOperation, AnnouncesNothingWhenItNeverWaits) {
  MockFunction<void()> announce;
  EXPECT_CALL(announce, Call).Times(0);
  Operation operation(announce.AsStdFunction());
  operation.withdraw();
}

TEST(AnOperation, NeedsNobodyToAnnounceItsWaitTo) { EXPECT_NO_THROW(Operation(nullptr).aboutToWait()); }

TEST(AnOperation, InterruptsItsWaitWhenItIsWithdrawn) {
  MockFunction<void()> interrupt;
  Operation operation(nullptr);
  const auto registration = operation.interruptWith(interrupt.AsStdFunction());
  EXPECT_FALSE(operation.isWithdrawn());
  EXPECT_CALL(interrupt, Call).WillOnce([&] { EXPECT_TRUE(operation.isWithdrawn()); });
  operation.withdraw();
  EXPECT_TRUE(operation.isWithdrawn());
}

TEST(AnOperation, InterruptsAWaitThatBeginsAfterItsWithdrawalAtOnce) {
  MockFunction<void()> interrupt;
  Operation operation(nullptr);
  operation.withdraw();
  EXPECT_CALL(interrupt, Call).Times(1);
  const auto registration = operation.interruptWith(interrupt.AsStdFunction());
}

TEST(AnOperation, LeavesAWaitAloneThatIsOver) {
  MockFunction<void()> interrupt;
  EXPECT_CALL(interrupt, Call).Times(0);
  Operation operation(nullptr);
  operation.interruptWith(interrupt.AsStdFunction()).reset();
  operation.withdraw();
}

TEST(AnOperation, InterruptsEveryWaitThatIsNotOver) {
  MockFunction<void()> outer;
  MockFunction<void()> inner;
  MockFunction<void()> over;
  Operation operation(nullptr);
  const auto first = operation.interruptWith(outer.AsStdFunction());
  const auto second = operation.interruptWith(inner.AsStdFunction());
  operation.interruptWith(over.AsStdFunction()).reset();
  EXPECT_CALL(outer, Call).Times(1);
  EXPECT_CALL(inner, Call).Times(1);
  EXPECT_CALL(over, Call).Times(0);
  operation.withdraw();
}

TEST(AnOperation, MayEndAWaitFromItsInterruption) {
  Operation operation(nullptr);
  std::shared_ptr<const void> registration;
  registration = operation.interruptWith([&] { registration.reset(); });
  operation.withdraw();
  EXPECT_EQ(registration, nullptr);
}

TEST(AnOperation, IsWithdrawnFromAnotherThreadWhateverItDoesJustThen) {
  for (int attempt = 0; attempt < 100; ++attempt) {
    Operation operation(nullptr);
    std::atomic<int> interruptions = 0;
    const auto registered = [&] {
      std::jthread other([&] { operation.withdraw(); });
      return operation.interruptWith([&] { ++interruptions; });
    }();
    EXPECT_EQ(interruptions, 1);
  }
}

TEST(AnOperation, ThatIsRevokedIsWithdrawnAndHasFailed) {
  MockFunction<void()> interrupt;
  Operation operation(nullptr);
  const auto registration = operation.interruptWith(interrupt.AsStdFunction());
  EXPECT_CALL(interrupt, Call).Times(1);
  operation.revoke();
  EXPECT_TRUE(operation.isWithdrawn());
  EXPECT_TRUE(operation.isLeftUnanswered());
  ASSERT_TRUE(operation.failure());
  EXPECT_EQ(operation.failure()->kind(), BusFailureKind::accessRevoked);
}

TEST(AnOperation, GoesOnWithWhatItsUserHasAllowedUntilItIsRevoked) {
  MockFunction<void()> interrupt;
  Operation operation(nullptr);
  const auto registration = operation.interruptWith(interrupt.AsStdFunction(), Operation::Interruption::revocation);
  EXPECT_CALL(interrupt, Call).Times(0);
  operation.withdraw();
  testing::Mock::VerifyAndClearExpectations(&interrupt);
  EXPECT_CALL(interrupt, Call).Times(2);
  operation.revoke();
  const auto afterwards = operation.interruptWith(interrupt.AsStdFunction(), Operation::Interruption::revocation);
}

TEST(AnOperation, WritesNothingOnceItIsRevoked) {
  const auto write = [] { return std::optional(Error{.domain = "disk", .code = 1}); };
  Operation operation(nullptr);
  EXPECT_EQ(operation.unlessRevoked(write)->domain, "disk");
  operation.revoke();
  EXPECT_EQ(operation
                .unlessRevoked([]() -> std::optional<Error> {
                  ADD_FAILURE() << "Nothing may be written.";
                  return std::nullopt;
                })
                ->description,
            operation.failure()->what());
}

TEST(AnOperation, IsRevokedWhenTheWriteThatIsUnderWayHasEnded) {
  for (int attempt = 0; attempt < 100; ++attempt) {
    Operation operation(nullptr);
    bool isStored = false;
    std::jthread other;
    const auto error = operation.unlessRevoked([&]() -> std::optional<Error> {
      other = std::jthread([&] {
        operation.revoke();
        EXPECT_TRUE(isStored);
      });
      while (!operation.isRevoked()) std::this_thread::yield();
      isStored = true;
      return std::nullopt;
    });
    EXPECT_FALSE(error);
  }
}

TEST(AnOperation, MayBeOutlivedByItsWaits) {
  MockFunction<void()> interrupt;
  EXPECT_CALL(interrupt, Call).Times(0);
  auto operation = std::make_shared<Operation>(nullptr);
  auto registration = operation->interruptWith(interrupt.AsStdFunction());
  const std::weak_ptr<Operation> ended = operation;
  operation.reset();
  registration.reset();
  EXPECT_TRUE(ended.expired());
}

TEST(AnOperation, RemembersForWhichAppATokenIsAsked) {
  Operation operation(nullptr);
  EXPECT_FALSE(operation.appOfAskedToken());
  operation.tokenIsAskedFor("1");
  EXPECT_EQ(operation.appOfAskedToken(), "1");
}

TEST(AnOperation, IsLeftUnansweredWhenItIsWithdrawnOrItsAlertIs) {
  Operation operation(nullptr);
  EXPECT_FALSE(operation.isLeftUnanswered());
  Operation withdrawn(nullptr);
  withdrawn.withdraw();
  EXPECT_TRUE(withdrawn.isLeftUnanswered());
  operation.alertWentUnanswered();
  EXPECT_TRUE(operation.isLeftUnanswered());
  EXPECT_FALSE(operation.isWithdrawn());
  EXPECT_FALSE(operation.isAnsweredByUser());
}

TEST(AnOperation, KnowsWhetherItsUserWasAsked) {
  Operation operation(nullptr);
  EXPECT_FALSE(operation.wasUserAsked());
  operation.userIsAsked();
  EXPECT_TRUE(operation.wasUserAsked());
  EXPECT_FALSE(operation.isAnsweredByUser());
}

TEST(AnOperation, KnowsItsFirstFailure) {
  Operation operation(nullptr);
  EXPECT_FALSE(operation.failure());
  operation.fail(BusFailure(BusFailureKind::storeUnavailable, "The disk is full."));
  operation.fail(BusFailure(BusFailureKind::failed, "And more."));
  ASSERT_TRUE(operation.failure());
  EXPECT_EQ(operation.failure()->kind(), BusFailureKind::storeUnavailable);
  EXPECT_STREQ(operation.failure()->what(), "The disk is full.");
}

TEST(TheCurrentOperation, IsItsThreadsAloneAsLongAsItIsCarried) {
  Operation operation(nullptr);
  EXPECT_EQ(Operation::current(), nullptr);
  {
    const OperationScope scope(operation);
    EXPECT_EQ(Operation::current(), &operation);
    std::jthread([&] {
      EXPECT_EQ(Operation::current(), nullptr);
      Operation another(nullptr);
      const OperationScope anotherScope(another);
      EXPECT_EQ(Operation::current(), &another);
    }).join();
    EXPECT_EQ(Operation::current(), &operation);
  }
  EXPECT_EQ(Operation::current(), nullptr);
}

TEST(AnOperation, NotesWhatItMayComeToOnce) {
  Operation operation([] {}, Intent{.accountTypeIdentifier = "type", .clientID = "photos", .appID = "1"});
  EXPECT_FALSE(operation.hasNotedGrant());
  int notes = 0;
  const auto note = [&](const Intent& grant) {
    EXPECT_EQ(grant.clientID, "photos");
    ++notes;
    return std::optional(Error{.domain = "disk", .code = 1, .description = "It is full."});
  };
  for (int call = 0; call < 2; ++call) {
    EXPECT_EQ(operation.noteGrant(note)->domain, "disk") << "whoever asks later learns what was answered";
  }
  EXPECT_EQ(notes, 1);
  EXPECT_TRUE(operation.hasNotedGrant());
}

}  // namespace
}  // namespace palisade
