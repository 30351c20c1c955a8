#include <string_view>

#include <gmock/gmock.h>

#include "Platform/AccountConstants.h"
#include "Tests/Unit/Support/PluginUnderTest.h"

namespace palisade {
namespace {

TEST(TheAccountType, IsServedWhenItIsFacebooks) {
  EXPECT_TRUE(PluginUnderTest::supportsAccountTypeWithIdentifier("com.veltran.accounttype.facebook"));
  EXPECT_TRUE(PluginUnderTest::supportsAccountTypeWithIdentifier(AccountTypeIdentifierFacebook));
}

class EveryOtherAccountType : public ::testing::TestWithParam<std::string_view> {};

TEST_P(EveryOtherAccountType, IsNotServed) { EXPECT_FALSE(PluginUnderTest::supportsAccountTypeWithIdentifier(GetParam())); }

using namespace std::string_view_literals;
INSTANTIATE_TEST_SUITE_P(, EveryOtherAccountType,
                         ::testing::Values("", "com.veltran.accounttype.faceboo", "com.veltran.accounttype.facebook2",
                                           "com.veltran.accounttype.Facebook", " com.veltran.accounttype.facebook",
                                           "com.veltran.accounttype.facebook\n", "com.veltran.accounttype.facebook\0"sv,
                                           "com.veltran.accounttype.other", "AccountTypeIdentifierFacebook", "%@"));

}  // namespace
}  // namespace palisade
