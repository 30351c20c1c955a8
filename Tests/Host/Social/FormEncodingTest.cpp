#include "Host/Http/FormEncoding.h"

#include <gtest/gtest.h>

#include <vector>

using namespace palisade;

TEST(AForm, KeepsItsFieldsInOrderAndRepeatsNames) {
  const std::vector<FormField> fields = {{"permissions", "email"}, {"app_id", "7"}, {"permissions", "user_likes"}};
  EXPECT_EQ(formEncoded(fields), "permissions=email&app_id=7&permissions=user_likes");
}

TEST(AForm, EscapesWhatWouldEndAFieldOrIsNoLetter) {
  const std::vector<FormField> fields = {{"a&b=c", "1+1 %\n\xC3\xA9,-._~"}};
  EXPECT_EQ(formEncoded(fields), "a%26b%3Dc=1%2B1%20%25%0A%C3%A9%2C-._~");
}

TEST(AForm, MayBeEmpty) { EXPECT_EQ(formEncoded({}), ""); }
