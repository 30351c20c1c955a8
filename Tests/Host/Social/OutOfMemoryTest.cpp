#include <gtest/gtest.h>

#include "Host/Http/CurlTransfer.h"
#include "Tests/Host/Social/Sandbox.h"
#include "Tests/Unit/Memory/FailingAllocations.h"

// Memory that runs out while an answer comes. libcurl calls the transfer from C, through which no exception may pass.

using namespace palisade;

namespace {

// Carries a request on this thread, whose allocations fail as planned while the library is at work.
HttpResult carried(const HttpClientOptions& options, const HttpRequest& request) {
  const CurlLibrary& curl = CurlLibrary::loaded();
  const std::unique_ptr<CURLM, decltype(curl.multiCleanup)> multi(curl.multiInit(), curl.multiCleanup);
  CurlTransfer transfer(curl, options, request);
  curl.multiAdd(multi.get(), transfer.handle());
  int running = 1;
  while (running > 0) {
    {
      const CountedAllocations counted;
      curl.multiPerform(multi.get(), &running);
    }
    if (running > 0) curl.multiPoll(multi.get(), nullptr, 0, 1000, nullptr);
  }
  int left = 0;
  const CURLMsg* const message = curl.multiReadInfo(multi.get(), &left);
  HttpResult result = transfer.result(message->data.result);
  curl.multiRemove(multi.get(), transfer.handle());
  return result;
}

class AnAnswer : public testing::TestWithParam<std::vector<FormField>> {};

TEST_P(AnAnswer, ForWhichThereIsNoMemoryIsAnError) {
  Sandbox sandbox;
  const HttpClientOptions options = sandbox.trusted({.bodyLimit = 10'000'000});
  bool hasFailed = true;
  for (std::size_t failing = 1; hasFailed; ++failing) {
    ASSERT_LT(failing, 1'000U);
    if (!GetParam().empty()) sandbox.arm(GetParam());
    planAllocations({.failing = failing});
    const HttpResult result = carried(options, meRequest(sandbox));
    hasFailed = anAllocationFailed();
    if (hasFailed) {
      EXPECT_EQ(codeOf(result), HttpErrorUnavailable) << sentenceOf(result);
    }
  }
}

INSTANTIATE_TEST_SUITE_P(OfEveryKind, AnAnswer,
                         testing::Values(std::vector<FormField>(), std::vector<FormField>{{"kind", "huge"}},
                                         std::vector<FormField>{{"kind", "head"}}, std::vector<FormField>{{"kind", "bomb"}}));

}  // namespace
