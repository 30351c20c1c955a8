// The border to the social framework: whatever fails behind it, nothing gets out.

#include "Facebook/Palisade/ExactlyOnce.h"

#include <gtest/gtest.h>

#include <stdexcept>

#include "Host/Json/Json.h"
#include "Testing/FakePlatform.h"

namespace palisade {
namespace {

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

}  // namespace
}  // namespace palisade
