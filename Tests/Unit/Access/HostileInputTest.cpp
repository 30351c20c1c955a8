// Requests as an ill-meaning or broken client makes them. None of them crashes, hangs or is granted without the user.

#include <ostream>
#include <string>
#include <string_view>
#include <vector>

#include <gmock/gmock.h>

#include "Tests/Unit/Access/OptionKeys.h"
#include "Tests/Unit/Support/Scene.h"

namespace palisade {
namespace {

using namespace std::string_literals;
using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::Field;
using ::testing::IsEmpty;
using ::testing::SizeIs;

struct SceneWithAnAllowingUser : Scene {
  explicit SceneWithAnAllowingUser(FakeClientData clientData = photosClient()) : Scene(std::move(clientData)) {
    addAccount();
    platform.alert.answers = {userAllows()};
    platform.social.descriptionAnswers = {{.data = R"("do things")"}};
    platform.strings.set("ACCOUNT_ACCESS_ONE_PERMISSION_SHORT_FORMAT", "%@ asks to %@.");
    platform.strings.set("ACCOUNT_ACCESS_UNKNOWN_FORMAT", "%@ asks to %@.");
    platform.strings.set("ACCOUNT_ACCESS_EXTENDED_READ", "read %@");
    platform.strings.set("ACCOUNT_ACCESS_EXTENDED_READ_USER", "%@");
    platform.strings.set("FACEBOOK_READ_PERMISSION_USER_LIKES", "likes");
  }
};

std::string shownMessage(const Scene& scene) {
  const auto alerts = scene.platform.trace.named("SystemAlert.createAlert");
  return alerts.empty() ? "no alert" : *alerts.back()["description"].dictionary()->find("message")->string();
}

Array unknownPermissions(std::size_t count) {
  Array permissions;
  for (std::size_t number = 0; number < count; ++number) permissions.emplace_back("permission" + std::to_string(number));
  return permissions;
}

class ManyPermissions : public ::testing::TestWithParam<std::size_t> {};

TEST_P(ManyPermissions, AreAskedForSentGrantedAndFoundAgain) {
  SceneWithAnAllowingUser scene;
  const Array permissions = unknownPermissions(GetParam());
  scene.platform.social.authorizationAnswers = {serverGrants(permissions)};

  EXPECT_THAT(scene.requestAccess(optionsAskingFor(permissions)), isGrant());
  EXPECT_EQ(scene.record()->permissions->size(), GetParam());
  EXPECT_EQ(scene.platform.trace.named("FacebookAuthorizationRequest.init")
                .at(0)["permissions"]
                .dictionary()
                ->find("$set")
                ->array()
                ->size(),
            GetParam());

  EXPECT_THAT(scene.requestAccess(optionsAskingFor(permissions)), isGrant()) << "The earlier grant covers them.";
  EXPECT_THAT(scene.platform.trace.named("SystemAlert.createAlert"), SizeIs(1));
}

TEST_P(ManyPermissions, ThatAreOneCountOnce) {
  SceneWithAnAllowingUser scene;
  scene.platform.social.authorizationAnswers = {serverGrants(Array(GetParam(), "email"))};
  EXPECT_THAT(scene.requestAccess(optionsAskingFor(Array(GetParam(), "email"))), isGrant());
  EXPECT_THAT(consentAskedFor(scene.platform.trace), ElementsAre("{email}"));
  EXPECT_EQ(scene.record()->permissions, PermissionSet{"email"});
}

TEST(OneMoreThanManyPermissions, IsAllThatTheUserIsAskedFor) {
  SceneWithAnAllowingUser scene;
  Array permissions = unknownPermissions(1'000);
  PermissionSet held;
  forEachString(permissions, [&](const std::string& name) { held.insert(name); });
  scene.addRecord({.options = persistentOptions(), .permissions = held});
  scene.platform.alert.answers = {userRefuses()};
  permissions.emplace_back("one more");
  EXPECT_THAT(scene.requestAccess(optionsAskingFor(permissions)), isRefusalWith(accountsError(7)));
  EXPECT_THAT(consentAskedFor(scene.platform.trace), ElementsAre("{one more}"));
}

INSTANTIATE_TEST_SUITE_P(, ManyPermissions, ::testing::Values(1'000, 100'000), ::testing::PrintToStringParamName());

const std::string hostileTexts[] = {
    "",
    "%@",
    "%@ %@ %d %s %n",
    "line\nbreak\r\n",
    "user_likes\0publish"s,
    "\0"s,
    "\xff\xfe\x80",
    "\xc0\xaf",
    "\xed\xa0\x80",
    "\xe2\x80\xae reversed",
    "user_likes ",
    " email",
    "EMAIL",
    "a,b",
    "\"quoted\\\"",
    std::string(1'000'000, 'x'),
};

class AHostileText : public ::testing::TestWithParam<std::string> {};

TEST_P(AHostileText, AsAPermissionIsUnknownAndPassedOnAsItIs) {
  SceneWithAnAllowingUser scene;
  scene.platform.social.authorizationAnswers = {{.data = R"({"access_token": "T"})"}};

  EXPECT_THAT(scene.requestAccess(optionsAskingFor({GetParam()})), isGrant());

  for (const char* request : {"FacebookPermissionDescriptionRequest.init", "FacebookAuthorizationRequest.init"}) {
    EXPECT_EQ(scene.platform.trace.named(request).at(0)["permissions"], tracedSet({GetParam()})) << request;
  }
  EXPECT_EQ(shownMessage(scene), "Photos asks to do things.");
}

TEST_P(AHostileText, AsAPermissionIsNotWhatItLooksLike) {
  SceneWithAnAllowingUser scene;
  scene.addRecord({.options = persistentOptions(), .permissions = PermissionSet{"email", "user_likes", "publish"}});
  scene.platform.alert.answers = {userRefuses()};
  EXPECT_THAT(scene.requestAccess(optionsAskingFor({GetParam()})), isRefusalWith(accountsError(7)));
  EXPECT_THAT(scene.platform.trace.named("SystemAlert.createAlert"), SizeIs(1));
}

TEST_P(AHostileText, AsAnAppIDOfAnEarlierGrantIsComparedWhole) {
  for (const std::string& other : {GetParam() + '\0', GetParam() + 'x', 'x' + GetParam()}) {
    SceneWithAnAllowingUser scene;
    scene.platform.alert.answers = {userRefuses()};
    scene.addRecord({.options = persistentOptions({}, GetParam()), .permissions = PermissionSet{"email"}});
    EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email"}, {}, other)), isRefusalWith(accountsError(7)));
  }
}

TEST_P(AHostileText, AsAnAudienceIsAnAudience) {
  SceneWithAnAllowingUser scene;
  scene.addRecord({.options = persistentOptions(GetParam()), .permissions = PermissionSet{"publish"}});
  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"publish"}, GetParam())), isGrant());
  EXPECT_EQ(shownMessage(scene), "no alert");

  scene.platform.alert.answers = {userRefuses()};
  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"publish"}, GetParam() + '\0')), isRefusalWith(accountsError(7)));
}

TEST_P(AHostileText, AsANameIsShownAsItIs) {
  FakeClientData client = photosClient();
  client.appName = GetParam();
  client.bundleID = GetParam();
  client.description = GetParam();
  SceneWithAnAllowingUser scene(client);
  scene.platform.social.authorizationAnswers = {serverGrants({"user_likes"})};

  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"user_likes"})), isGrant());

  EXPECT_EQ(shownMessage(scene), GetParam() + " asks to read likes.");
  EXPECT_EQ(logLines(scene.platform.trace).at(0).arguments, std::vector{GetParam()});
  EXPECT_EQ(scene.platform.trace.named("logAccessRequest").at(0)["bundleID"], Value(GetParam()));
  EXPECT_EQ(scene.platform.trace.named("FacebookAuthorizationRequest.init").at(0)["bundleID"], Value(GetParam()));
  EXPECT_NE(scene.platform.keychain.entry("me", GetParam()), nullptr);
}

INSTANTIATE_TEST_SUITE_P(, AHostileText, ::testing::ValuesIn(hostileTexts),
                         [](const auto& row) { return "Number" + std::to_string(row.index); });

TEST(AClientWithoutABundleIDWhoseNameHoldsAPlaceholder, IsNamedVerbatimInTheError) {
  SceneWithAnAllowingUser scene({.id = "tool", .appName = "%@", .description = "50%@ off"});
  EXPECT_THAT(
      scene.requestAccess(optionsAskingFor({"email"})),
      isRefusalWith(accountsError(16, "Cannot obtain server authorization for client 50%@ off because it has no bundle ID.")));
}

TEST(AServersReasonWithAPlaceholder, IsQuotedVerbatim) {
  SceneWithAnAllowingUser scene;
  scene.platform.social.authorizationAnswers = {{.data = R"({"error_msg": "50%@ %d off"})"}};
  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email"})),
              isRefusalWith(accountsError(7, "The Facebook server could not fulfill this access request: 50%@ %d off")));
}

TEST(ADescriptionWithAPlaceholder, IsShownVerbatim) {
  SceneWithAnAllowingUser scene;
  scene.platform.social.descriptionAnswers = {{.data = R"("read %@ of %@")"}};
  scene.requestAccess(optionsAskingFor({"future"}));
  EXPECT_EQ(shownMessage(scene), "Photos asks to read %@ of %@.");
}

Value nested(std::size_t depth, const Value& innermost) {
  Value value = innermost;
  for (std::size_t level = 0; level < depth; ++level) {
    if (level % 2 == 0) {
      Array array;
      array.push_back(std::move(value));
      value = Value(std::move(array));
    } else {
      Dictionary dictionary;
      dictionary.set(permissionsKey, std::move(value));
      value = Value(std::move(dictionary));
    }
  }
  return value;
}

TEST(AValueDeepInsideTheOptions, IsNeitherAPermissionNorAnAudienceNorAnAppID) {
  for (const std::size_t depth : {1U, 2U, 500U}) {
    for (const Value& innermost : {Value("publish"), Value(nullptr), Value(Array{"publish"})}) {
      SceneWithAnAllowingUser scene;
      const Value value = nested(depth, innermost);
      EXPECT_THAT(scene.requestAccess(Dictionary{{appIDKey, value}}), isRefusalWith(accountsError(8)));
      EXPECT_THAT(scene.requestAccess(Dictionary{{appIDKey, "1"}, {permissionsKey, Dictionary{{permissionsKey, value}}}}),
                  isRefusalWith(accountsError(8)));
      Dictionary writing = optionsAskingFor({"publish"});
      writing.set(audienceKey, value);
      EXPECT_THAT(scene.requestAccess(writing), isRefusalWith(accountsError(8)));

      // A list inside the list names nothing: the user is asked for nothing.
      EXPECT_THAT(scene.requestAccess(optionsAskingFor({Array{value}, value})).granted, false);
      EXPECT_EQ(scene.platform.trace.named("FacebookAuthorizationRequest.init").at(0)["permissions"], tracedSet({}));
    }
  }
}

TEST(AnAudienceOfAnotherTypeBesideReading, IsKeptByTheGrantAndReadAsNoneLater) {
  SceneWithAnAllowingUser scene;
  scene.platform.social.authorizationAnswers = {serverGrants({"user_likes"})};
  const Value audience = nested(100, 7);
  Dictionary reading = optionsAskingFor({"user_likes"});
  reading.set(audienceKey, audience);

  EXPECT_THAT(scene.requestAccess(reading), isGrant());
  EXPECT_EQ(*scene.record()->options->find(audienceKey), audience);
  EXPECT_THAT(scene.requestAccess(reading), isGrant());
  EXPECT_THAT(scene.platform.trace.named("SystemAlert.createAlert"), SizeIs(1));
}

}  // namespace
}  // namespace palisade
