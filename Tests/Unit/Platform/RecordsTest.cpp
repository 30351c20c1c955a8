// The plain objects that the daemon and a plug-in hand to each other: dates, credentials, grants, errors.

#include <gmock/gmock.h>

#include "Platform/AccountCredential.h"
#include "Platform/ClientAuthorization.h"
#include "Platform/Date.h"
#include "Platform/Error.h"
#include "Platform/SystemAlert.h"

namespace palisade {
namespace {

using ::testing::IsNull;
using ::testing::Optional;

TEST(TheDistantFuture, IsTheLastSecondOfTheYear9999) {
  EXPECT_EQ(distantFuture.time_since_epoch(), std::chrono::seconds(253402300799));

  const auto nextSecond = std::chrono::floor<std::chrono::days>(distantFuture + std::chrono::seconds(1));
  EXPECT_EQ(std::chrono::year_month_day(nextSecond), std::chrono::year(10000) / std::chrono::January / 1);
}

TEST(TheDistantFuture, IsLaterThanToday) {
  EXPECT_GT(distantFuture, std::chrono::floor<std::chrono::seconds>(std::chrono::system_clock::now()));
}

TEST(ACredential, KeepsItsTokenItsRefreshTokenAndItsExpiry) {
  const AccountCredential credential("token", "refresh", Date(std::chrono::seconds(5)));

  EXPECT_THAT(credential.oauthToken(), Optional(std::string("token")));
  EXPECT_EQ(credential.refreshToken(), "refresh");
  EXPECT_EQ(credential.expiryDate(), Date(std::chrono::seconds(5)));
}

TEST(ACredential, TellsNoTokenFromAnEmptyOne) {
  EXPECT_EQ(AccountCredential(std::nullopt, "", distantFuture).oauthToken(), std::nullopt);
  EXPECT_THAT(AccountCredential("", "", distantFuture).oauthToken(), Optional(std::string()));
}

TEST(ANewAuthorization, GrantsNothing) {
  const ClientAuthorization record(nullptr);

  EXPECT_FALSE(record.isGranted());
  EXPECT_THAT(record.options(), IsNull());
  EXPECT_THAT(record.grantedPermissions(), IsNull());
}

TEST(TwoErrors, AreEqualWhenAllThatTheyCarryIs) {
  const Error error{.domain = "D", .code = 1, .description = "text"};

  EXPECT_EQ(error, (Error{.domain = "D", .code = 1, .description = "text"}));
  EXPECT_NE(error, (Error{.domain = "E", .code = 1, .description = "text"}));
  EXPECT_NE(error, (Error{.domain = "D", .code = 2, .description = "text"}));
  EXPECT_NE(error, (Error{.domain = "D", .code = 1, .description = "other"}));
  EXPECT_NE(error, (Error{.domain = "D", .code = 1}));
  EXPECT_NE((Error{.domain = "D", .code = 1, .description = ""}), (Error{.domain = "D", .code = 1}));
  EXPECT_NE((Error{.domain = "D", .code = 1, .furtherInfo = {{"host", "a"}}}),
            (Error{.domain = "D", .code = 1, .furtherInfo = {{"host", "b"}}}));
}

TEST(PermissionNames, AreToldApartByTheirBytes) {
  const PermissionSet names{"email", "Email", "email ", std::string("email\0", 6)};

  EXPECT_EQ(names.size(), 4u);
  EXPECT_TRUE(names.contains(std::string_view("email")));
  EXPECT_FALSE(names.contains(std::string_view("EMAIL")));
}

TEST(NobodysAnswer, IsNotTheDefaultButton) { EXPECT_NE(AlertResponseNobody, AlertResponseDefaultButton); }

}  // namespace
}  // namespace palisade
