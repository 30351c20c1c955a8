#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <future>

#include "Tests/Host/Social/ListeningSocket.h"
#include "Tests/Host/Social/Sandbox.h"

// What a server may do to a client that trusts it: attacks 13, 14 and 16.

using namespace palisade;
using namespace std::chrono_literals;
using testing::HasSubstr;
using testing::IsEmpty;

namespace {

struct FaultCase {
  std::string name;
  std::vector<FormField> fault;
  int code;
};
void PrintTo(const FaultCase& fault, std::ostream* stream) { *stream << fault.name; }

class AServerThatFails : public testing::TestWithParam<FaultCase> {};

TEST_P(AServerThatFails, IsAnErrorThatSaysHow) {
  Sandbox sandbox;
  sandbox.arm(GetParam().fault);
  HttpClient client(sandbox.trusted({.stallLimit = 1s, .totalLimit = 3s}));
  const HttpResult result = ask(client, meRequest(sandbox));
  EXPECT_EQ(codeOf(result), GetParam().code) << sentenceOf(result);
  EXPECT_THAT(sentenceOf(result), HasSubstr(sandbox.address().substr(8)));
  EXPECT_EQ(answerOf(ask(client, meRequest(sandbox))).statusCode, 401) << "the next request meets no fault";
}

INSTANTIATE_TEST_SUITE_P(Table, AServerThatFails,
                         testing::Values(FaultCase{"silent", {{"kind", "silent"}}, HttpErrorTimedOut},
                                         FaultCase{"slow", {{"kind", "slow"}}, HttpErrorTimedOut},
                                         FaultCase{"stalledInTheHead", {{"kind", "stall"}, {"bytes", "20"}}, HttpErrorTimedOut},
                                         FaultCase{
                                             "stalledInTheBody", {{"kind", "stall"}, {"bytes", "100"}}, HttpErrorTimedOut},
                                         FaultCase{"closed", {{"kind", "close"}}, HttpErrorReset},
                                         FaultCase{"reset", {{"kind", "reset"}}, HttpErrorReset},
                                         FaultCase{"resetInTheBody", {{"kind", "reset"}, {"bytes", "100"}}, HttpErrorReset},
                                         FaultCase{"huge", {{"kind", "huge"}}, HttpErrorTooLarge},
                                         FaultCase{"compressed", {{"kind", "bomb"}}, HttpErrorMalformed},
                                         FaultCase{"compressedOnTheWay", {{"kind", "transfer-bomb"}}, HttpErrorTooLarge},
                                         FaultCase{"hugeHead", {{"kind", "head"}}, HttpErrorTooLarge},
                                         FaultCase{"garbage", {{"kind", "garbage"}}, HttpErrorMalformed}),
                         [](const auto& test) { return test.param.name; });

TEST(AServerThatStandsStill, IsGivenUpAfterTheStallLimitAlone) {
  Sandbox sandbox;
  sandbox.arm({{"kind", "stall"}, {"bytes", "30"}});
  HttpClient client(sandbox.trusted({.stallLimit = 1s}));
  EXPECT_EQ(codeOf(ask(client, meRequest(sandbox))), HttpErrorTimedOut);
}

std::size_t answerSize(Sandbox& sandbox, HttpClient& client) {
  const std::string body = answerOf(ask(client, meRequest(sandbox))).body;
  const std::string head = "HTTP/1.1 401 Sandbox\r\nContent-Type: application/json\r\nContent-Length: \r\n\r\n";
  return head.size() + std::to_string(body.size()).size() + body.size();
}

class ACutConnection : public testing::TestWithParam<const char*> {};

TEST_P(ACutConnection, IsAnErrorAtEveryByte) {
  Sandbox sandbox;
  HttpClient client(sandbox.trusted());
  const std::size_t size = answerSize(sandbox, client);
  for (std::size_t bytes = 0; bytes < size; ++bytes) {
    sandbox.arm({{"kind", GetParam()}, {"bytes", std::to_string(bytes)}});
    HttpClient fresh(sandbox.trusted());
    EXPECT_NE(codeOf(ask(fresh, meRequest(sandbox))), 0) << bytes;
  }
}

INSTANTIATE_TEST_SUITE_P(Kinds, ACutConnection, testing::Values("close", "reset"));

TEST(AStalledAnswer, EndsWithTheTotalLimitAtEveryByte) {
  Sandbox sandbox;
  HttpClient client(sandbox.trusted());
  const std::size_t size = answerSize(sandbox, client);
  constexpr std::size_t atATime = 40;
  for (std::size_t first = 0; first < size; first += atATime) {
    HttpClient impatient(sandbox.trusted({.totalLimit = 500ms}));
    std::vector<std::future<HttpResult>> results;
    std::vector<std::unique_ptr<HttpTransfer>> transfers;
    for (std::size_t bytes = first; bytes < std::min(size, first + atATime); ++bytes) {
      sandbox.arm({{"kind", "stall"}, {"bytes", std::to_string(bytes)}});
      auto promise = std::make_shared<std::promise<HttpResult>>();
      results.push_back(promise->get_future());
      transfers.push_back(
          impatient.send(meRequest(sandbox), [promise](HttpResult result) { promise->set_value(std::move(result)); }));
    }
    for (std::future<HttpResult>& result : results) EXPECT_EQ(codeOf(result.get()), HttpErrorTimedOut);
  }
}

class ARedirect : public testing::TestWithParam<std::tuple<int, const char*>> {};

TEST_P(ARedirect, IsAnErrorAndNobodyGoesThere) {
  const auto& [status, scheme] = GetParam();
  Sandbox sandbox;
  Sandbox elsewhere;
  ListeningSocket plain;
  const std::string location = std::string(scheme) == "https"  ? elsewhere.url("/me")
                               : std::string(scheme) == "http" ? "http://" + plain.name() + "/"
                               : std::string(scheme) == "file" ? "file:///etc/passwd"
                                                               : "/oauth/invalidation";
  sandbox.arm({{"kind", "redirect"}, {"status", std::to_string(status)}, {"location", location}});
  HttpClient client(sandbox.trusted());
  const HttpResult result = ask(client, meRequest(sandbox, "the-token"));
  EXPECT_EQ(codeOf(result), HttpErrorRedirect) << sentenceOf(result);
  EXPECT_THAT(elsewhere.requests(), IsEmpty());
  EXPECT_FALSE(plain.hasVisitor());
  EXPECT_EQ(sandbox.requests().size(), 1U);
}

INSTANTIATE_TEST_SUITE_P(EachStatusAndPlace, ARedirect,
                         testing::Combine(testing::Values(301, 302, 303, 307, 308, 300, 304),
                                          testing::Values("https", "http", "file", "path")),
                         [](const auto& test) { return std::to_string(std::get<0>(test.param)) + std::get<1>(test.param); });

// Attack 12.
class AnAnswerThatComesTwice : public testing::TestWithParam<int> {};

TEST_P(AnAnswerThatComesTwice, IsNotTakenForTheAnswerToTheNextRequest) {
  Sandbox sandbox;
  sandbox.arm({{"kind", "twice"}, {"bytes", std::to_string(GetParam())}});
  HttpClient client(sandbox.trusted());
  EXPECT_EQ(answerOf(ask(client, meRequest(sandbox))).statusCode, 401);
  const HttpAnswer next =
      answerOf(ask(client, {.url = sandbox.url("/oauth/authorization"), .bearerToken = sandbox.masterToken(), .form = ""}));
  EXPECT_EQ(next.statusCode, 400);
  EXPECT_THAT(next.body, HasSubstr("invalid_request"));
}

INSTANTIATE_TEST_SUITE_P(BeginningWithBytes, AnAnswerThatComesTwice, testing::Values(0, 1, 30, 84, 86, 88, 90, 100, 150));

struct RetryCase {
  std::string name;
  std::string text;
  std::optional<std::pair<std::chrono::seconds, std::chrono::seconds>> between;
};
void PrintTo(const RetryCase& retry, std::ostream* stream) { *stream << retry.name; }

class RetryAfter : public testing::TestWithParam<RetryCase> {};

TEST_P(RetryAfter, IsReadAsSecondsOrAsADate) {
  Sandbox sandbox;
  sandbox.arm({{"kind", "unavailable"}, {"retry_after", GetParam().text}});
  HttpClient client(sandbox.trusted());
  const HttpAnswer answer = answerOf(ask(client, meRequest(sandbox)));
  EXPECT_EQ(answer.statusCode, 503);
  ASSERT_EQ(answer.retryAfter.has_value(), GetParam().between.has_value());
  if (!answer.retryAfter) return;
  EXPECT_GE(*answer.retryAfter, GetParam().between->first);
  EXPECT_LE(*answer.retryAfter, GetParam().between->second);
}

INSTANTIATE_TEST_SUITE_P(
    Table, RetryAfter,
    testing::Values(RetryCase{"none", "", std::nullopt}, RetryCase{"seconds", "120", {{120s, 120s}}},
                    RetryCase{"aDateToCome", "Fri, 31 Dec 9999 23:59:59 GMT", {{24h * 365 * 10, 24h * 365 * 9000}}},
                    RetryCase{"aDateThatWas", "Fri, 31 Dec 1999 23:59:59 GMT", std::nullopt},
                    RetryCase{"nonsense", "soon", std::nullopt}, RetryCase{"negative", "-5", std::nullopt}),
    [](const auto& test) { return test.param.name; });

// Attack 17.
class ABadServer : public testing::TestWithParam<const char*> {};

TEST_P(ABadServer, IsRefusedBeforeItSeesARequest) {
  Sandbox sandbox({"--certificate", GetParam()});
  HttpClient client(sandbox.trusted());
  const HttpResult result = ask(client, meRequest(sandbox, "the-token"));
  EXPECT_EQ(codeOf(result), HttpErrorTls) << sentenceOf(result);
  EXPECT_THAT(sandbox.requests(), IsEmpty());
}

INSTANTIATE_TEST_SUITE_P(Kinds, ABadServer,
                         testing::Values("expired", "not-yet-valid", "wrong-name", "self-signed", "unknown-authority",
                                         "client-only", "weak-key", "weak-signature", "not-an-authority", "excluded-name",
                                         "old-protocol", "plain"));

TEST(AServer, IsRefusedWhenItsAuthorityIsNotTheSystems) {
  Sandbox sandbox;
  HttpClient client;
  EXPECT_EQ(codeOf(ask(client, meRequest(sandbox))), HttpErrorTls);
  EXPECT_THAT(sandbox.requests(), IsEmpty());
}

TEST(AServer, IsRefusedWhenTheAuthoritiesCannotBeRead) {
  Sandbox sandbox;
  HttpClient client({.certificateAuthorities = sandbox.folder() / "missing.pem"});
  const HttpResult result = ask(client, meRequest(sandbox));
  EXPECT_EQ(codeOf(result), HttpErrorTls);
  EXPECT_THAT(sentenceOf(result), HasSubstr("missing.pem"));
}

}  // namespace
