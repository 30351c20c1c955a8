// The borders to the daemon and to the social framework: one answer each, and nothing else gets out.

#include "Facebook/Palisade/ExactlyOnce.h"

#include <stdexcept>
#include <string>
#include <vector>

#include <gmock/gmock.h>

#include "Facebook/Palisade/AwaitedAnswer.h"
#include "Host/Json/Json.h"
#include "Testing/FakePlatform.h"
#include "Tests/Unit/Support/Values.h"

namespace palisade {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;

TEST(AHandlerWhoseFailureCannotBeToldEither, LetsNothingOutAndLogsBoth) {
  FakePlatform& platform = FakePlatform::create(std::make_shared<NlohmannJsonParser>());
  const auto handler =
      takeFirstAnswer([](const auto&, const auto&, const auto&) { throw std::runtime_error("handling failed"); },
                      [](const std::exception_ptr&) { throw std::runtime_error("telling failed"); }, platform.log, "operation");

  EXPECT_NO_THROW(handler(std::nullopt, std::nullopt, std::nullopt));

  const auto records = platform.trace.named("log");
  ASSERT_EQ(records.size(), 2U);
  EXPECT_EQ(records[0]["rendered"], Value("The access decision failed unexpectedly: handling failed"));
  EXPECT_EQ(records[1]["rendered"], Value("The access decision failed unexpectedly: telling failed"));
}

TEST(AHandler, IsHandedAllOfTheAnswer) {
  FakePlatform& platform = FakePlatform::create(std::make_shared<NlohmannJsonParser>());
  const Error error{.domain = "org.example", .code = 3};
  int calls = 0;
  const auto handler = takeFirstAnswer(
      [&](const std::optional<std::string>& data, const std::optional<HttpResponse>& response,
          const std::optional<Error>& given) {
        ++calls;
        EXPECT_EQ(data, "body");
        ASSERT_TRUE(response);
        EXPECT_EQ(response->statusCode, 503);
        EXPECT_EQ(given, error);
      },
      [](const std::exception_ptr&) { FAIL() << "Nothing failed."; }, platform.log, "operation");

  handler("body", HttpResponse{503}, error);
  handler("another", HttpResponse{200}, std::nullopt);

  EXPECT_EQ(calls, 1);
}

class AnOperation : public ::testing::Test {
 protected:
  // What the completion is told when `body` runs, and what stands in the log then.
  void perform(const AnsweredOperation& body) { answerExactlyOnce(_platform.completion(), _platform.log, "operation", body); }

  std::vector<CompletionCall> told() const { return _platform.completions(); }
  std::vector<LogLine> logged() const { return logLines(_platform.trace); }

  FakePlatform& _platform = FakePlatform::create(std::make_shared<NlohmannJsonParser>());
};

TEST_F(AnOperation, ThatAnswersTwiceIsHeardOnceAndInSilence) {
  perform([](const AccessCompletion& answer) {
    answer(true, std::nullopt);
    answer(false, networkDown);
  });
  EXPECT_THAT(told(), ElementsAre(isGrant()));
  EXPECT_THAT(logged(), IsEmpty());
}

TEST_F(AnOperation, ThatThrowsAfterItsAnswerKeepsIt) {
  perform([](const AccessCompletion& answer) {
    answer(true, std::nullopt);
    throw std::runtime_error("too late");
  });
  EXPECT_THAT(told(), ElementsAre(isGrant()));
  EXPECT_THAT(logged(),
              ElementsAre(LogLine{3, "operation", "The access decision failed unexpectedly: %@", {"too late"}, "failure"}));
}

TEST_F(AnOperation, ThatKeepsItsAnswerMayGiveItLater) {
  AccessCompletion kept;
  perform([&](const AccessCompletion& answer) { kept = answer; });
  EXPECT_THAT(told(), IsEmpty());
  kept(false, networkDown);
  EXPECT_THAT(told(), ElementsAre(isRefusalWith(networkDown)));
  kept = nullptr;
  EXPECT_THAT(told(), ::testing::SizeIs(1));
  EXPECT_THAT(logged(), IsEmpty());
}

TEST(AnAwaitedAnswer, IsTheFirstThatComes) {
  AwaitedAnswer<int> answer;
  auto future = answer.future();
  answer.bring(1);
  EXPECT_NO_THROW(answer.bring(2));
  EXPECT_NO_THROW(answer.fail(std::make_exception_ptr(std::runtime_error("too late"))));
  EXPECT_EQ(future.get(), 1);
}

TEST(AnAwaitedAnswer, MayBeAFailure) {
  AwaitedAnswer<int> answer;
  auto future = answer.future();
  answer.fail(std::make_exception_ptr(std::runtime_error("failed")));
  EXPECT_NO_THROW(answer.bring(2));
  EXPECT_THAT([&] { future.get(); }, ::testing::ThrowsMessage<std::runtime_error>("failed"));
}

TEST(AnAwaitedAnswer, ThatNobodyBringsEndsTheWait) {
  std::future<int> future;
  {
    AwaitedAnswer<int> answer;
    future = answer.future();
  }
  EXPECT_THAT([&] { future.get(); },
              ::testing::ThrowsMessage<std::runtime_error>("a service dropped its callback without calling it"));
}

}  // namespace
}  // namespace palisade
