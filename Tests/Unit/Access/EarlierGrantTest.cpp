// What an earlier record of the client does to its next request.

#include <ostream>
#include <string>
#include <vector>

#include <gmock/gmock.h>

#include "Tests/Unit/Support/Scene.h"

namespace palisade {
namespace {

using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::Not;

const Dictionary noOptions;

TEST(ARefusedRecord, RefusesAgainWithoutAPrompt) {
  const RecordData records[] = {
      {.granted = false},
      {.granted = false, .options = persistentOptions()},
      {.granted = false, .options = persistentOptions(), .permissions = PermissionSet{"email"}},
      {.granted = false, .options = persistentOptions({}, "another app"), .permissions = PermissionSet{"email"}},
  };
  for (const RecordData& record : records) {
    for (const Array& permissions : {Array{"email"}, Array{"user_likes"}, Array{}}) {
      Scene scene;
      scene.addAccount();
      scene.addRecord(record);
      scene.platform.alert.answers = {userAllows()};

      EXPECT_THAT(scene.requestAccess(optionsAskingFor(permissions)), isRefusalWithoutError());

      EXPECT_THAT(stepsOf(scene.platform.trace),
                  ElementsAre("\"Palisade is handling request for access from %@.\"", "Client.hasEntitlement",
                              "Client.hasEntitlement", "AccountStore.accountsWithAccountTypeIdentifier",
                              "Account.setAccountType", "AuthorizationManager.authorizationForClient", "completion"));
      EXPECT_EQ(scene.record(), record);
    }
  }
}

struct Comparison {
  const char* name;
  std::optional<Dictionary> earlierOptions;
  std::optional<PermissionSet> earlierPermissions;
  Dictionary options;
  /// The permissions that the user is asked for, as the log names them, or none when the request is granted at once.
  std::optional<std::string> askedFor;
};

void PrintTo(const Comparison& comparison, std::ostream* stream) { *stream << comparison.name; }

Dictionary withAudience(Value audience) {
  Dictionary options = persistentOptions();
  options.set(std::string(FacebookAudienceKey), std::move(audience));
  return options;
}

Dictionary withAppID(Value appID) { return {{std::string(FacebookAppIdKey), std::move(appID)}}; }

class AGrantedRecord : public ::testing::TestWithParam<Comparison> {};

TEST_P(AGrantedRecord, AnswersForWhatItCovers) {
  const auto& [name, earlierOptions, earlierPermissions, options, askedFor] = GetParam();
  const RecordData earlier{.options = earlierOptions, .permissions = earlierPermissions};
  Scene scene;
  scene.addAccount();
  scene.addRecord(earlier);
  scene.platform.alert.answers = {userRefuses()};

  const CompletionCall answer = scene.requestAccess(options);

  EXPECT_EQ(scene.record(), earlier);
  if (askedFor) {
    EXPECT_THAT(consentAskedFor(scene.platform.trace), ElementsAre(*askedFor));
    EXPECT_THAT(scene.platform.trace.names(), Contains("SystemAlert.createAlert").Times(1));
    EXPECT_THAT(answer, isRefusalWith(accountsError(7)));
  } else {
    EXPECT_THAT(answer, isGrant());
    EXPECT_THAT(stepsOf(scene.platform.trace),
                ElementsAre("\"Palisade is handling request for access from %@.\"", "Client.hasEntitlement",
                            "Client.hasEntitlement", "AccountStore.accountsWithAccountTypeIdentifier", "Account.setAccountType",
                            "AuthorizationManager.authorizationForClient", "completion"));
  }
}

constexpr auto everyone = FacebookAudienceEveryone;
constexpr auto friends = FacebookAudienceFriends;

const Comparison comparisons[] = {
    {"TheSamePermissions",
     persistentOptions(),
     PermissionSet{"email", "user_likes"},
     optionsAskingFor({"email", "user_likes"}),
     {}},
    {"FewerPermissions", persistentOptions(), PermissionSet{"email", "user_likes"}, optionsAskingFor({"email"}), {}},
    {"NothingOfAGrantThatHoldsSomething", persistentOptions(), PermissionSet{"email"}, optionsAskingFor({}), {}},
    {"UnknownPermissionsThatWereGranted", persistentOptions(), PermissionSet{"future"}, optionsAskingFor({"future"}), {}},
    {"MorePermissions", persistentOptions(), PermissionSet{"email"}, optionsAskingFor({"email", "user_likes"}), "{user_likes}"},
    {"OtherPermissions", persistentOptions(), PermissionSet{"email"}, optionsAskingFor({"user_likes"}), "{user_likes}"},
    {"ANameInAnotherCase", persistentOptions(), PermissionSet{"Email"}, optionsAskingFor({"email"}), "{email}"},

    {"NothingOfAGrantThatHoldsNothing", persistentOptions(), PermissionSet{}, optionsAskingFor({}), "{}"},
    {"NothingOfAGrantWithoutPermissions", persistentOptions(), std::nullopt, optionsAskingFor({}), "{}"},
    {"SomethingOfAGrantWithoutPermissions", persistentOptions(), std::nullopt, optionsAskingFor({"email"}), "{email}"},
    {"NothingOfAnotherAppsGrant", persistentOptions({}, "another app"), PermissionSet{"email"}, optionsAskingFor({}), "{}"},

    {"AnotherApp", persistentOptions({}, "another app"), PermissionSet{"email", "user_likes"},
     optionsAskingFor({"email", "user_likes"}), "{email, user_likes}"},
    {"AnAppThatBeginsAlike", persistentOptions({}, photosAppID + " "), PermissionSet{"email"}, optionsAskingFor({"email"}),
     "{email}"},
    {"AGrantWithoutOptions", std::nullopt, PermissionSet{"email"}, optionsAskingFor({"email"}), "{email}"},
    {"AGrantWithoutAnApp", noOptions, PermissionSet{"email"}, optionsAskingFor({"email"}), "{email}"},
    {"AGrantWhoseAppIsANumber", withAppID(1234567890), PermissionSet{"email"}, optionsAskingFor({"email"}), "{email}"},
    {"AGrantWhoseAppIsNull", withAppID(nullptr), PermissionSet{"email"}, optionsAskingFor({"email"}), "{email}"},
    {"AGrantWhoseAppIsAList", withAppID(Array{photosAppID}), PermissionSet{"email"}, optionsAskingFor({"email"}), "{email}"},
    {"AGrantWhoseAppIsEmpty", withAppID(""), PermissionSet{"email"}, optionsAskingFor({"email"}), "{email}"},

    {"WritingForTheSameAudience",
     persistentOptions(everyone),
     PermissionSet{"publish", "email"},
     optionsAskingFor({"publish", "email"}, everyone),
     {}},
    {"WritingForTheSameAudienceThatNobodyKnows",
     persistentOptions("Martians"),
     PermissionSet{"publish"},
     optionsAskingFor({"publish"}, "Martians"),
     {}},
    {"WritingForAnotherAudience", persistentOptions(everyone), PermissionSet{"publish", "publish_stream", "email"},
     optionsAskingFor({"publish", "email"}, friends), "{publish}"},
    {"WritingForANarrowerAudience", persistentOptions(everyone), PermissionSet{"publish"},
     optionsAskingFor({"publish"}, FacebookAudienceOnlyMe), "{publish}"},
    {"WritingForAnAudienceInAnotherCase", persistentOptions("facebookaudienceeveryone"), PermissionSet{"publish"},
     optionsAskingFor({"publish"}, everyone), "{publish}"},
    {"WritingAfterAGrantWithoutAnAudience", persistentOptions(), PermissionSet{"publish", "email"},
     optionsAskingFor({"publish"}, everyone), "{publish}"},
    {"WritingAfterAGrantWhoseAudienceIsANumber", withAudience(1), PermissionSet{"publish"},
     optionsAskingFor({"publish"}, everyone), "{publish}"},
    {"WritingAfterAGrantWhoseAudienceIsNull", withAudience(nullptr), PermissionSet{"publish"},
     optionsAskingFor({"publish"}, everyone), "{publish}"},
    {"EveryKindOfWritingForAnotherAudience", persistentOptions(everyone),
     PermissionSet{"publish", "publish_actions", "publish_checkins", "publish_stream", "email"},
     optionsAskingFor({"publish", "publish_actions", "publish_checkins", "publish_stream", "email"}, friends),
     "{publish, publish_actions, publish_checkins, publish_stream}"},
    {"OneMoreKindOfWritingForTheSameAudience", persistentOptions(everyone), PermissionSet{"publish"},
     optionsAskingFor({"publish", "publish_stream"}, everyone), "{publish_stream}"},
    {"ReadingBesideAGrantToWriteForAnotherAudience",
     persistentOptions(everyone),
     PermissionSet{"publish", "email"},
     optionsAskingFor({"email"}, friends),
     {}},
    {"ReadingWithoutAnAudienceBesideAGrantToWrite",
     persistentOptions(everyone),
     PermissionSet{"publish", "email"},
     optionsAskingFor({"email"}),
     {}},
    {"ManagingForAnotherAudience",
     persistentOptions(everyone),
     PermissionSet{"manage_pages"},
     optionsAskingFor({"manage_pages"}, friends),
     {}},
};

INSTANTIATE_TEST_SUITE_P(, AGrantedRecord, ::testing::ValuesIn(comparisons), nameOfCase<Comparison>);

TEST(AnExtension, SendsOnlyTheNewPermissionsToTheServerAndKeepsWhatTheServerSays) {
  Scene scene;
  scene.addAccount();
  scene.addRecord({.options = persistentOptions(), .permissions = PermissionSet{"email"}});
  scene.platform.alert.answers = {userAllows()};
  scene.platform.social.authorizationAnswers = {serverGrants({"user_likes"})};

  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email", "user_likes"})), isGrant());

  EXPECT_EQ(scene.platform.trace.named("FacebookAuthorizationRequest.init")[0]["permissions"], tracedSet({"user_likes"}));
  EXPECT_EQ(scene.record()->permissions, PermissionSet{"user_likes"});
}

TEST(AnExtensionThatTheUserRefuses, KeepsTheEarlierGrant) {
  const RecordData earlier{.options = persistentOptions(), .permissions = PermissionSet{"email"}};
  Scene scene;
  scene.addAccount();
  scene.addRecord(earlier);
  scene.platform.alert.answers = {userRefuses()};

  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email", "user_likes"})), isRefusalWith(accountsError(7)));

  EXPECT_EQ(scene.record(), earlier);
  EXPECT_THAT(scene.platform.trace.names(), Not(Contains("AuthorizationManager.setAuthorization")));
}

TEST(AChangeOfAudience, TakesEveryEarlierWritePermissionOutOfTheNewGrant) {
  Scene scene(photosClientEntitledTo(FacebookDefaultAccessEntitlement));
  scene.addRecord({.options = persistentOptions(everyone),
                   .permissions = PermissionSet{"publish", "publish_stream", "publish_actions", "publish_checkins", "email"}});

  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"publish"}, friends)), isGrant());

  EXPECT_EQ(scene.record(),
            (RecordData{.options = persistentOptions(friends), .permissions = PermissionSet{"publish", "email"}}));
}

TEST(ARecordOfAnotherAccountType, IsNotThisClientsRecord) {
  Scene scene;
  scene.addAccount();
  ClientAuthorization refused(scene.client);
  scene.authorizations.addRecord(refused, "com.veltran.accounttype.other");
  scene.platform.alert.answers = {userAllows()};
  scene.platform.social.authorizationAnswers = {serverGrants({"email"})};
  EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email"})), isGrant());
}

}  // namespace
}  // namespace palisade
