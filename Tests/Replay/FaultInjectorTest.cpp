#include "Testing/FaultInjector.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <ostream>
#include <stdexcept>

#include "Host/Json/Json.h"
#include "Platform/AccountConstants.h"
#include "Platform/AccountType.h"
#include "Testing/FakePlatform.h"

namespace palisade {
namespace {

using ::testing::Eq;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Optional;
using ::testing::SizeIs;
using ::testing::Throws;
using ::testing::ThrowsMessage;

FakePlatform& makePlatform() { return FakePlatform::create(std::make_shared<NlohmannJsonParser>()); }

struct PlatformCall {
  const char* name;
  std::function<void(FakePlatform&)> make;
};

void PrintTo(const PlatformCall& row, std::ostream* stream) { *stream << row.name; }

const AccountType faultedType{std::string(AccountTypeIdentifierFacebook)};

std::shared_ptr<const Client> someClient(FakePlatform& platform) { return platform.makeClient({.id = "photos"}); }
std::shared_ptr<Account> someAccount(FakePlatform& platform) {
  return std::make_shared<FakeAccount>(Instruments{platform.trace, platform.faults}, FakeAccountData{.id = "1", .type = "t"});
}

// One row for each operation of every interface that a plug-in is given.
const PlatformCall platformCalls[] = {
    {"Log.isEnabled", [](FakePlatform& platform) { platform.log.isEnabled(LogLevel::debug); }},
    {"Log.write",
     [](FakePlatform& platform) {
       platform.log.write({.place = {"name"}, .level = LogLevel::error, .format = "", .argumentNames = "", .arguments = {}});
     }},
    {"Log.logAccessRequest", [](FakePlatform& platform) { platform.log.logAccessRequest({}); }},
    {"Client.bundleID", [](FakePlatform& platform) { someClient(platform)->bundleID(); }},
    {"Client.localizedAppName", [](FakePlatform& platform) { someClient(platform)->localizedAppName(); }},
    {"Client.hasEntitlement", [](FakePlatform& platform) { someClient(platform)->hasEntitlement("e"); }},
    {"Client.description", [](FakePlatform& platform) { someClient(platform)->description(); }},
    {"Account.description", [](FakePlatform& platform) { someAccount(platform)->description(); }},
    {"Account.setAccountType", [](FakePlatform& platform) { someAccount(platform)->setAccountType(nullptr); }},
    {"Account.credential", [](FakePlatform& platform) { someAccount(platform)->credential(); }},
    {"Account.setCredential", [](FakePlatform& platform) { someAccount(platform)->setCredential(nullptr); }},
    {"AccountStore.accountsWithAccountTypeIdentifier",
     [](FakePlatform& platform) { platform.store->accountsWithAccountTypeIdentifier("t"); }},
    {"AccountStore.authorizationManager", [](FakePlatform& platform) { platform.store->authorizationManager(); }},
    {"AuthorizationManager.authorizationForClient",
     [](FakePlatform& platform) { platform.authorizations.authorizationForClient(someClient(platform), faultedType); }},
    {"AuthorizationManager.allAuthorizationsForAccountType",
     [](FakePlatform& platform) { platform.authorizations.allAuthorizationsForAccountType(faultedType); }},
    {"AuthorizationManager.setAuthorization",
     [](FakePlatform& platform) {
       const auto client = someClient(platform);
       platform.authorizations.setAuthorization(ClientAuthorization(client), client, faultedType);
     }},
    {"AuthorizationManager.removeAllClientAuthorizationsForAccountType",
     [](FakePlatform& platform) { platform.authorizations.removeAllClientAuthorizationsForAccountType(faultedType); }},
    {"KeychainManager.credentialForAccount",
     [](FakePlatform& platform) { platform.keychain.credentialForAccount(someAccount(platform), std::nullopt); }},
    {"KeychainManager.setCredentialForAccount",
     [](FakePlatform& platform) { platform.keychain.setCredentialForAccount(someAccount(platform), std::nullopt); }},
    {"KeychainManager.removeCredentialForAccount",
     [](FakePlatform& platform) { platform.keychain.removeCredentialForAccount(someAccount(platform), std::nullopt); }},
    {"FacebookSession.create", [](FakePlatform& platform) { platform.social.makeFacebookSession(); }},
    {"FacebookSession.revokeAccessTokenForAppWithID",
     [](FakePlatform& platform) { platform.social.makeFacebookSession()->revokeAccessTokenForAppWithID("42"); }},
    {"FacebookAuthorizationRequest.init",
     [](FakePlatform& platform) { platform.social.makeFacebookAuthorizationRequest("42", "b", nullptr, std::nullopt); }},
    {"FacebookAuthorizationRequest.setAccessToken",
     [](FakePlatform& platform) {
       platform.social.makeFacebookAuthorizationRequest("42", "b", nullptr, std::nullopt)->setAccessToken("t");
     }},
    {"FacebookAuthorizationRequest.performRequestWithHandler",
     [](FakePlatform& platform) {
       platform.social.makeFacebookAuthorizationRequest("42", "b", nullptr, std::nullopt)->performRequestWithHandler({});
     }},
    {"FacebookPermissionDescriptionRequest.init",
     [](FakePlatform& platform) { platform.social.makeFacebookPermissionDescriptionRequest(nullptr, std::nullopt); }},
    {"FacebookPermissionDescriptionRequest.setAccessToken",
     [](FakePlatform& platform) {
       platform.social.makeFacebookPermissionDescriptionRequest(nullptr, std::nullopt)->setAccessToken("t");
     }},
    {"FacebookPermissionDescriptionRequest.performRequestWithHandler",
     [](FakePlatform& platform) {
       platform.social.makeFacebookPermissionDescriptionRequest(nullptr, std::nullopt)->performRequestWithHandler({});
     }},
    {"SystemAlert.createAlert",
     [](FakePlatform& platform) { platform.alert.createAlert(AlertAllocator::defaultAllocator, 0, 0, nullptr, {}); }},
    {"SystemAlert.receiveResponse",
     [](FakePlatform& platform) {
       AlertResponse response = AlertResponseNobody;
       platform.alert.receiveResponse(nullptr, 0, response);
     }},
    {"SystemAlert.releaseAlert", [](FakePlatform& platform) { platform.alert.releaseAlert(nullptr); }},
    {"Preferences.copyValue",
     [](FakePlatform& platform) { platform.preferences.copyValue("k", "d", PreferencesUser::current, PreferencesHost::any); }},
    {"Preferences.synchronize", [](FakePlatform& platform) { platform.preferences.synchronize("d"); }},
    {"NotificationBus.register",
     [](FakePlatform& platform) { platform.notifications.registerHandler("n", platform.queues.makeSerialQueue("q"), [] {}); }},
    {"Queue.create", [](FakePlatform& platform) { platform.queues.makeSerialQueue("q"); }},
    {"SerialQueue.label", [](FakePlatform& platform) { platform.queues.makeSerialQueue("q")->label(); }},
    {"SerialQueue.async", [](FakePlatform& platform) { platform.queues.makeSerialQueue("q")->async([] {}); }},
    {"SerialQueue.sync", [](FakePlatform& platform) { platform.queues.makeSerialQueue("q")->sync([] {}); }},
    {"SerialQueue.work", [](FakePlatform& platform) { platform.queues.makeSerialQueue("q")->sync([] {}); }},
    {"JsonParser.parse", [](FakePlatform& platform) { platform.json.parse("1", JsonFragments::allowed); }},
    {"StringTable.localizedString", [](FakePlatform& platform) { platform.strings.localizedString("K", "", "Localizable"); }},
};

class EveryPlatformCall : public ::testing::TestWithParam<PlatformCall> {};

TEST_P(EveryPlatformCall, ThrowsWhenItIsTold) {
  FakePlatform& platform = makePlatform();
  platform.faults.throwOn(GetParam().name);
  EXPECT_THAT([&] { GetParam().make(platform); }, ThrowsMessage<InjectedFault>(HasSubstr(GetParam().name)));
  EXPECT_THAT(platform.faults.firstFault(), Optional(Eq(GetParam().name)));
}

TEST_P(EveryPlatformCall, LeavesNothingInTheTraceWhenItThrows) {
  FakePlatform& platform = makePlatform();
  platform.faults.throwOn(GetParam().name);
  EXPECT_THROW(GetParam().make(platform), InjectedFault);
  EXPECT_THAT(platform.trace.named(GetParam().name), IsEmpty());
}

TEST_P(EveryPlatformCall, SucceedsWhenNothingIsToFail) {
  FakePlatform& platform = makePlatform();
  EXPECT_NO_THROW(GetParam().make(platform));
  EXPECT_FALSE(platform.faults.hasThrown());
}

INSTANTIATE_TEST_SUITE_P(Platform, EveryPlatformCall, ::testing::ValuesIn(platformCalls),
                         [](const ::testing::TestParamInfo<PlatformCall>& row) {
                           std::string name = row.param.name;
                           name.erase(name.find('.'), 1);
                           return name;
                         });

TEST(AFaultByNumber, HitsThatCallAlone) {
  FakePlatform& platform = makePlatform();
  platform.faults.throwOnCall(2);
  EXPECT_TRUE(platform.log.isEnabled(LogLevel::debug));
  EXPECT_THAT([&] { platform.preferences.synchronize("d"); }, Throws<InjectedFault>());
  EXPECT_NO_THROW(platform.preferences.synchronize("d"));
  EXPECT_THAT(platform.faults.callCount(), Eq(3u));
}

TEST(AFaultByNumber, ThatIsStickyHitsEveryLaterCall) {
  FakePlatform& platform = makePlatform();
  platform.faults.throwFromCall(2);
  EXPECT_NO_THROW(platform.preferences.synchronize("d"));
  EXPECT_THROW(platform.preferences.synchronize("d"), InjectedFault);
  EXPECT_THROW(platform.log.isEnabled(LogLevel::debug), InjectedFault);
}

TEST(AFaultByName, HitsTheCallOfThatNumberAmongItsOwn) {
  FakePlatform& platform = makePlatform();
  platform.faults.throwOn("Preferences.synchronize", 2);
  EXPECT_NO_THROW(platform.preferences.synchronize("d"));
  EXPECT_NO_THROW(platform.log.isEnabled(LogLevel::debug));
  EXPECT_THROW(platform.preferences.synchronize("d"), InjectedFault);
  EXPECT_NO_THROW(platform.preferences.synchronize("d"));
}

TEST(AFault, MayBeOfAnyType) {
  FakePlatform& platform = makePlatform();
  platform.faults.throwAlwaysOn("Preferences.synchronize");
  platform.faults.raiseWith([](const std::string&) { throw 42; });
  EXPECT_THAT([&] { platform.preferences.synchronize("d"); }, Throws<int>(Eq(42)));
}

TEST(AFault, OnAQueueReachesWhoeverWaitsForTheWork) {
  FakePlatform& platform = makePlatform();
  const auto queue = platform.queues.makeSerialQueue("q");
  EXPECT_THAT([&] { queue->sync([] { throw std::out_of_range("here"); }); }, ThrowsMessage<std::out_of_range>(Eq("here")));
  EXPECT_NO_THROW(queue->sync([] {}));
}

TEST(AClearedInjector, LetsEverythingPass) {
  FakePlatform& platform = makePlatform();
  platform.faults.throwFromCall(1);
  platform.faults.throwAlwaysOn("Preferences.synchronize");
  EXPECT_THROW(platform.preferences.synchronize("d"), InjectedFault);
  platform.faults.clear();
  EXPECT_NO_THROW(platform.preferences.synchronize("d"));
  EXPECT_FALSE(platform.faults.hasThrown());
}

TEST(ALogRecord, CountsAsOneCallWhateverItDescribes) {
  FakePlatform& platform = makePlatform();
  const auto client = someClient(platform);
  platform.faults.throwAlwaysOn("Client.description");
  EXPECT_NO_THROW(platform.log.record("name", LogLevel::debug, "%@", "client", client));
  EXPECT_THAT(platform.faults.callCount(), Eq(2u)) << "isEnabled and write";
  EXPECT_THAT(platform.trace.named("log"), SizeIs(1));
}

}  // namespace
}  // namespace palisade
