#include "Host/Secrets/KnownSecrets.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <thread>
#include <vector>

namespace palisade {
namespace {

using testing::HasSubstr;
using testing::Not;

const std::string words = "granted/for everyone.\"but\\nobody\"";

class AKnownSecret : public testing::Test {
 protected:
  std::string shown(const std::string& text) const { return known.withoutSecrets(text); }

  KnownSecrets known;
};

TEST_F(AKnownSecret, IsMaskedWhateverItLooksLike) {
  for (const std::string secret : {"user_photos_of_everybody", "a.b/c:d;e,f!g?h", "Zürich, Köln und Genève", "sixsix",
                                   "eleven chars", "a token with blanks in it and no digit"}) {
    known.remember(secret);
    EXPECT_EQ(shown("before" + secret + "after " + secret), "before[masked]after [masked]") << secret;
  }
}

TEST_F(AKnownSecret, IsMaskedInEveryWritingThatATextHoldsItIn) {
  known.remember(words);
  for (const std::string writing :
       {"granted%2Ffor%20everyone.%22but%5Cnobody%22", "granted%2ffor%20everyone.%22but%5cnobody%22",
        "granted/for everyone.\\\"but\\\\nobody\\\"", "granted\\/for everyone.\\\"but\\\\nobody\\\"",
        "6772616e7465642f666f722065766572796f6e652e22627574", "6772616E7465642F666F722065766572796F6E652E22627574",
        "Z3JhbnRlZC9mb3IgZXZlcnlvbmUuImJ1dFxub2JvZHki",
        "QmVhcmVyIGdyYW50ZWQvZm9yIGV2ZXJ5b25lLiJidXRcbm9ib2R5Ig==",     // "Bearer " before it
        "QmVhcmVyIDpncmFudGVkL2ZvciBldmVyeW9uZS4iYnV0XG5vYm9keSI=",     // "Bearer :" before it
        "QmVhcmVyIDo6Z3JhbnRlZC9mb3IgZXZlcnlvbmUuImJ1dFxub2JvZHki"}) {  // "Bearer ::" before it
    EXPECT_THAT(shown("(" + writing + ")"), HasSubstr("[masked]")) << writing;
    EXPECT_LT(shown(writing).size(), writing.size() / 2) << shown(writing);
  }
}

TEST_F(AKnownSecret, IsMaskedWhereATextHoldsAPieceOfIt) {
  known.remember("abcdefghijklmnopqrstuvwxyz");
  EXPECT_EQ(shown("mnopqrstuvwxyz"), "[masked]");
  EXPECT_EQ(shown("abcdefghijkl..."), "[masked]...");
  EXPECT_EQ(shown("1 abcdefghijklm 2 nopqrstuvwxyz 3"), "1 [masked] 2 [masked] 3");
  EXPECT_EQ(shown("abcdefghijk"), "abcdefghijk") << "eleven bytes are too few to tell";
}

TEST_F(AKnownSecret, IsOneOfManyThatHavePiecesInCommon) {
  known.remember("sandbox-token-of-ada");
  known.remember("sandbox-token-of-bob");
  EXPECT_EQ(shown("sandbox-token-of-bob, sandbox-token-of-ada"), "[masked], [masked]");
}

TEST_F(AKnownSecret, MasksNoOtherText) {
  known.remember("EAAx7Qk2LmZ0vB9cRt5YpW3sHd8JfN1gUo4KaTe6");
  known.remember("short");
  known.remember("");
  for (const std::string text : {"", "short", "Access to com.veltran.accounttype.facebook for org.example.photos was granted.",
                                 "EAAx", "EAAB7Qk2LmZ0"}) {
    EXPECT_EQ(shown(text), text);
  }
}

TEST_F(AKnownSecret, IsForgottenWhenTooManyOthersWereSeenSince) {
  known.remember("the one that was seen once");
  known.remember("the one that is seen again and again");
  for (int number = 0; number < 20; ++number) {
    std::string large;
    for (int place = 0; large.size() < 1024; ++place) large += std::to_string(number * 7919 + place * 104729);
    known.remember(large);
    known.remember("the one that is seen again and again");
    EXPECT_THAT(shown(large), Not(HasSubstr(large.substr(0, 12))));
  }
  EXPECT_EQ(shown("the one that is seen again and again"), "[masked]");
  EXPECT_EQ(shown("that was seen once"), "that was seen once");
}

TEST_F(AKnownSecret, MayBeSeenByManyThreads) {
  std::vector<std::jthread> threads;
  for (int thread = 0; thread < 4; ++thread) {
    threads.emplace_back([this, thread] {
      for (int round = 0; round < 50; ++round) {
        const std::string secret = "a secret of " + std::to_string(thread) + " and " + std::to_string(round);
        known.remember(secret);
        EXPECT_EQ(shown(secret), masked);
      }
    });
  }
}

}  // namespace
}  // namespace palisade
