// The preference to leave access requests alone, and how it is read.

#include <cstdint>
#include <limits>
#include <ostream>
#include <string>
#include <vector>

#include <gmock/gmock.h>

#include "Tests/Unit/Support/Scene.h"

namespace palisade {
namespace {

using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::Field;
using ::testing::IsEmpty;

constexpr const char* preferencesQueue = "com.veltran.social.facebook.preferencesQueue";

struct Setting {
  const char* name;
  std::optional<Value> value;
  bool ignores;
};

void PrintTo(const Setting& setting, std::ostream* stream) { *stream << setting.name; }

class ThePreference : public ::testing::TestWithParam<Setting> {};

TEST_P(ThePreference, IsReadAsABoolean) {
  Scene scene;
  scene.platform.preferences.set(FacebookIgnoreAccessRequests, FacebookPreferencesAppID, GetParam().value);
  EXPECT_EQ(scene.plugin->_shouldIgnoreAccessRequest(), GetParam().ignores);
}

TEST_P(ThePreference, DecidesWhetherAnApprovedRequestComesToAnything) {
  Scene scene;
  scene.addAccount();
  scene.platform.preferences.set(FacebookIgnoreAccessRequests, FacebookPreferencesAppID, GetParam().value);
  scene.platform.alert.answers = {userAllows()};
  scene.platform.social.authorizationAnswers = {serverGrants({"email"})};

  const CompletionCall answer = scene.requestAccess(optionsAskingFor({"email"}));

  if (GetParam().ignores) {
    EXPECT_THAT(answer, isRefusalWithoutError());
    EXPECT_EQ(scene.record(), std::nullopt);
    EXPECT_THAT(scene.platform.trace.named("FacebookAuthorizationRequest.init"), IsEmpty());
  } else {
    EXPECT_THAT(answer, isGrant());
  }
}

INSTANTIATE_TEST_SUITE_P(, ThePreference,
                         ::testing::Values(Setting{"Absent", std::nullopt, false}, Setting{"True", true, true},
                                           Setting{"False", false, false}, Setting{"One", 1, true}, Setting{"Zero", 0, false},
                                           Setting{"MinusOne", -1, true},
                                           Setting{"TheLeastNumber", std::numeric_limits<std::int64_t>::min(), true},
                                           Setting{"TheGreatestNumber", std::numeric_limits<std::uint64_t>::max(), true},
                                           Setting{"AFraction", 0.25, true}, Setting{"RealZero", 0.0, false},
                                           Setting{"NegativeZero", -0.0, false}, Setting{"Null", nullptr, false},
                                           Setting{"TextTrue", "true", false}, Setting{"TextOne", "1", false},
                                           Setting{"EmptyText", "", false}, Setting{"AnArray", Array{true}, false},
                                           Setting{"ADictionary", Dictionary{{"FacebookIgnoreAccessRequests", true}}, false}),
                         nameOfCase<Setting>);

TEST(APreferenceRead, AsksForTheKeyOfTheCurrentUserOnThePreferencesQueue) {
  Scene scene;
  scene.plugin->_shouldIgnoreAccessRequest();
  const auto reads = scene.platform.trace.named("Preferences.copyValue");
  EXPECT_THAT(reads, ElementsAre(Field(&Event::members, Dictionary{{"queue", preferencesQueue},
                                                                   {"key", "FacebookIgnoreAccessRequests"},
                                                                   {"domain", "com.veltran.social.facebook"},
                                                                   {"user", "current"},
                                                                   {"host", "any"}})));
  EXPECT_THAT(reads, Each(Field(&Event::thread, "preferences")));
}

TEST(APreferenceRead, SeesWhatTheUserSetMeanwhile) {
  Scene scene;
  EXPECT_FALSE(scene.plugin->_shouldIgnoreAccessRequest());
  scene.platform.preferences.set(FacebookIgnoreAccessRequests, FacebookPreferencesAppID, true);
  EXPECT_TRUE(scene.plugin->_shouldIgnoreAccessRequest());
  scene.platform.preferences.set(FacebookIgnoreAccessRequests, FacebookPreferencesAppID, std::nullopt);
  EXPECT_FALSE(scene.plugin->_shouldIgnoreAccessRequest());
}

TEST(APreferenceRead, LooksAtNoOtherKeyAndNoOtherDomain) {
  Scene scene;
  scene.platform.preferences.set("FacebookIgnoreAccessRequest", FacebookPreferencesAppID, true);
  scene.platform.preferences.set(FacebookIgnoreAccessRequests, "com.veltran.social", true);
  EXPECT_FALSE(scene.plugin->_shouldIgnoreAccessRequest());
}

TEST(APreferenceRead, IsMadeOnlyForRequestsThatWouldEndWithARecord) {
  Scene scene;
  scene.addAccount();
  scene.addRecord({.options = persistentOptions(), .permissions = PermissionSet{"email"}});
  scene.requestAccess(optionsAskingFor({"email"}));
  scene.requestAccess(std::nullopt);
  scene.authorize();
  scene.revoke();
  scene.requestAccess(optionsAskingFor({"email"}));
  scene.revokeAll();
  EXPECT_THAT(scene.platform.trace.named("Preferences.copyValue"), IsEmpty());
}

TEST(APreferenceThatCannotBeRead, RefusesTheRequest) {
  Scene scene;
  scene.addAccount();
  scene.platform.alert.answers = {userAllows()};
  scene.platform.faults.throwOn("Preferences.copyValue");
  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email"})), isUnexpectedFailureAnswer());
  EXPECT_EQ(scene.record(), std::nullopt);
}

}  // namespace
}  // namespace palisade
