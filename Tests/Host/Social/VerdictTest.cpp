#include "Host/Vantad/Verdict.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "Host/Json/Json.h"
#include "Host/Vantad/RetryPolicy.h"

using namespace palisade;
using namespace std::chrono_literals;
using testing::HasSubstr;
using testing::Not;

namespace {

using Kind = Verdict::Kind;

struct VerdictCase {
  std::string name;
  HttpResult result;
  Kind kind;
  bool concernsServer = false;
};
void PrintTo(const VerdictCase& verdict, std::ostream* stream) { *stream << verdict.name; }

HttpAnswer answer(int status, std::string body = {}) {
  return {.statusCode = status, .mediaType = "application/json", .body = std::move(body), .retryAfter = 60s};
}

class AnAnswer : public testing::TestWithParam<VerdictCase> {};

TEST_P(AnAnswer, DecidesWhatBecomesOfAnInvalidation) {
  const Verdict verdict = judge(GetParam().result, NlohmannJsonParser());
  EXPECT_EQ(verdict.kind, GetParam().kind);
  EXPECT_EQ(verdict.concernsServer, GetParam().concernsServer);
  EXPECT_THAT(verdict.sentence, Not(HasSubstr("secret")));
}

INSTANTIATE_TEST_SUITE_P(
    Table, AnAnswer,
    testing::Values(VerdictCase{"ok", answer(200), Kind::confirmed}, VerdictCase{"noContent", answer(204), Kind::confirmed},
                    VerdictCase{"created", answer(201), Kind::tryAgain, true},
                    VerdictCase{"accepted", answer(202), Kind::tryAgain, true},
                    VerdictCase{"unknownToken", answer(404, R"({"error":"unknown_token"})"), Kind::confirmed},
                    VerdictCase{"wrongPath", answer(404, "<html>"), Kind::tryAgain, true},
                    VerdictCase{"wrongPathInJson", answer(404, R"({"error":"not_found"})"), Kind::tryAgain, true},
                    VerdictCase{"unknownTokenAsText", answer(404, R"("unknown_token")"), Kind::tryAgain, true},
                    VerdictCase{"unsigned", answer(401, "secret"), Kind::tryAgain, false},
                    VerdictCase{"badRequest", answer(400, "secret"), Kind::refused},
                    VerdictCase{"forbidden", answer(403), Kind::refused}, VerdictCase{"gone", answer(410), Kind::refused},
                    VerdictCase{"slow", answer(408), Kind::tryAgain, true},
                    VerdictCase{"tooMany", answer(429), Kind::tryAgain, true},
                    VerdictCase{"broken", answer(500, "secret"), Kind::tryAgain, true},
                    VerdictCase{"busy", answer(503), Kind::tryAgain, true},
                    VerdictCase{"offline", httpError(HttpErrorUnreachable, "Nobody there."), Kind::tryAgain, true},
                    VerdictCase{"redirect", httpError(HttpErrorRedirect, "Elsewhere."), Kind::tryAgain, true},
                    VerdictCase{"badCertificate", httpError(HttpErrorTls, "Not secure."), Kind::tryAgain, true},
                    VerdictCase{"cancelled", httpError(HttpErrorCancelled, "Cancelled."), Kind::untried}),
    [](const auto& test) { return test.param.name; });

TEST(ABusyServer, IsLeftAloneForAsLongAsItAsks) {
  EXPECT_EQ(judge(answer(503), NlohmannJsonParser()).retryAfter, 60s);
  EXPECT_EQ(judge(answer(429), NlohmannJsonParser()).retryAfter, 60s);
}

TEST(Pauses, DoubleUpToTheLongest) {
  const RetryPolicy policy;
  EXPECT_EQ(policy.after(1, 0.0), 5s);
  EXPECT_EQ(policy.after(2, 0.0), 10s);
  EXPECT_EQ(policy.after(5, 0.0), 80s);
  EXPECT_EQ(policy.after(11, 0.0), 3600s);
  EXPECT_EQ(policy.after(1'000'000'000'000, 0.0), 3600s);
  EXPECT_EQ(policy.after(0, 0.0), 5s);
}

TEST(Pauses, AreShortenedByChanceByAtMostAHalf) {
  const RetryPolicy policy;
  EXPECT_EQ(policy.after(2, 1.0), 5s);
  EXPECT_EQ(policy.after(2, 0.5), 7s);
  EXPECT_GE(policy.after(1, 1.0), 1s);
}

TEST(AServersWish, IsGrantedWithinReason) {
  const RetryPolicy policy;
  EXPECT_EQ(policy.asked(120s), 120s);
  EXPECT_EQ(policy.asked(0s), 1s);
  EXPECT_EQ(policy.asked(24h * 365 * 8000), 24h);
}

}  // namespace
