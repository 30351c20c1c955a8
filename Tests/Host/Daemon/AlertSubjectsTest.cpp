// What an alert says about who asks: only as much as is known of this very caller.

#include "Host/Daemon/AlertSubjects.h"

#include <gmock/gmock.h>

namespace palisade {
namespace {

RegisteredClient clientOf(ClientClass clientClass, bool isBeyondImitation = false) {
  return RegisteredClient({.id = "org.example.photos",
                           .bundleID = "org.example.photos",
                           .name = "Photos",
                           .clientClass = clientClass,
                           .entitlements = {},
                           .recordFile = {},
                           .isBeyondImitation = isBeyondImitation});
}

TEST(WhoAsks, HasItsOwnNameAndIdentifier) {
  const AlertSubject subject = subjectOf(clientOf(ClientClass::sandboxed));
  EXPECT_EQ(subject.applicationName, "Photos");
  EXPECT_EQ(subject.applicationID, "org.example.photos");
  EXPECT_EQ(subject.account, "");
}

TEST(WhoAsks, IsCertainOnlyIfNoOtherProgramCanPretendToBeIt) {
  EXPECT_EQ(subjectOf(clientOf(ClientClass::sandboxed, true)).certainty, AlertCertainty::certain);
  EXPECT_EQ(subjectOf(clientOf(ClientClass::sandboxed)).certainty, AlertCertainty::likely);
  EXPECT_EQ(subjectOf(clientOf(ClientClass::unknownSandbox)).certainty, AlertCertainty::claimedInSandbox);
  EXPECT_EQ(subjectOf(clientOf(ClientClass::unit)).certainty, AlertCertainty::claimed);
  EXPECT_EQ(subjectOf(clientOf(ClientClass::bare, true)).certainty, AlertCertainty::claimed);
}

}  // namespace
}  // namespace palisade
