// Memory that runs out at every moment of every operation: one allocation that fails, and all from one on.
//
// Whatever cannot be had, the operation comes back, its completion has been called exactly once, and nothing is granted that
// was not stored.

#include <functional>
#include <list>
#include <ostream>
#include <string>
#include <vector>

#include <gmock/gmock.h>

#include "Tests/Unit/Access/FreshProcess.h"
#include "Tests/Unit/Memory/FrugalPlatform.h"
#include "Tests/Unit/Support/PluginUnderTest.h"
#include "Tests/Unit/Support/Values.h"

namespace palisade {
namespace {

// Whoever has to be told needs no memory to be told.
struct Told {
  int calls = 0;
  bool granted = false;
  int errorCode = 0;
  bool isUnexpectedFailure = false;
  bool isOutOfMemory = false;
};

constexpr std::string_view failedUnexpectedly = "The access decision failed unexpectedly: ";
constexpr std::string_view outOfMemory = "out of memory";

struct Stage {
  FrugalPlatform& platform = FrugalPlatform::create();
  const std::shared_ptr<PluginUnderTest> plugin = std::make_shared<PluginUnderTest>(platform.services());
  const std::shared_ptr<FrugalStore> store = std::make_shared<FrugalStore>();
  const std::shared_ptr<FrugalClient> client = std::make_shared<FrugalClient>();
  const std::shared_ptr<const AccountType> accountType =
      std::make_shared<const AccountType>(std::string(AccountTypeIdentifierFacebook));
  std::shared_ptr<const Dictionary> options = std::make_shared<const Dictionary>(optionsAskingFor({"email"}));
  Told told;

  void addRecord(bool granted) {
    ClientAuthorization record(client);
    record.setIsGranted(granted);
    record.setOptions(std::make_shared<const Dictionary>(persistentOptions()));
    record.setGrantedPermissions(permissionSet({"email"}));
    store->record = record;
  }

  void askFor(Array permissions, std::optional<std::string_view> audience = std::nullopt) {
    options = std::make_shared<const Dictionary>(optionsAskingFor(std::move(permissions), audience));
  }

  AccessCompletion completion() {
    return [told = &told](bool granted, const std::optional<Error>& error) {
      const bool isUnexpectedFailure = error && error->domain == AccountsErrorDomain && error->description &&
                                       error->code == AccountsErrorUnexpectedFailure &&
                                       error->description->starts_with(failedUnexpectedly);
      *told = {.calls = told->calls + 1,
               .granted = granted,
               .errorCode = error ? error->code : 0,
               .isUnexpectedFailure = isUnexpectedFailure,
               .isOutOfMemory = isUnexpectedFailure && error->description->substr(failedUnexpectedly.size()) == outOfMemory};
    };
  }
};

// Stages stay as long as the process, because their platforms do.
Stage& newStage() {
  static auto& stages = *new std::list<Stage>;
  return stages.emplace_back();
}

void request(Stage& stage, AccessCompletion completion) {
  stage.plugin->handleAccessRequestToAccountsOfType(stage.accountType, stage.client, stage.options, stage.store, true,
                                                    std::move(completion));
}
void authorize(Stage& stage, AccessCompletion completion) {
  stage.plugin->authorizeAccessToAccountsOfType(stage.accountType, stage.client, stage.store, std::move(completion));
}
void revoke(Stage& stage, AccessCompletion completion) {
  stage.plugin->revokeAccessToAccountsOfType(stage.accountType, stage.client, stage.store, std::move(completion));
}
void revokeAll(Stage& stage, AccessCompletion completion) {
  stage.plugin->revokeAllAccessToAccountsOfType(stage.accountType, stage.store, std::move(completion));
}

struct Operation {
  const char* name;
  std::function<void(Stage&)> prepare;
  void (*perform)(Stage&, AccessCompletion);
  bool grants;
  int errorCode = 0;
};

void PrintTo(const Operation& operation, std::ostream* stream) { *stream << operation.name; }

void anAccount(Stage& stage) { stage.store->account = std::make_shared<FrugalAccount>(); }

std::function<void(Stage&)> anAccountAnd(std::function<void(Stage&)> more) {
  return [more = std::move(more)](Stage& stage) {
    anAccount(stage);
    more(stage);
  };
}

const std::vector<Operation> operations = {
    {"AConsent", anAccount, request, true},
    {"AConsentAnsweredLater", anAccountAnd([](Stage& stage) { stage.platform.holdsAnswers = true; }), request, true},
    {"AConsentToEveryKindOfPermission", anAccountAnd([](Stage& stage) {
       stage.askFor({"email", "friends_likes", "user_likes", "publish", "manage_pages", "create_event", "future"},
                    FacebookAudienceOnlyMe);
     }),
     request, true},
    {"AConsentThatTheServerDoesNotFulfil",
     anAccountAnd([](Stage& stage) { stage.platform.authorizationBody = R"({"error_msg": "no such app, and many words"})"; }),
     request, false, AccountsErrorAccessDenied},
    {"AConsentThatTheServerAnswersWithRubbish", anAccountAnd([](Stage& stage) { stage.platform.authorizationBody = "<html>"; }),
     request, false, JsonErrorMalformed},
    {"AConsentOfAClientWithoutABundleID", anAccountAnd([](Stage& stage) { stage.client->hasBundleID = false; }), request, false,
     AccountsErrorNoBundleID},
    {"ARefusal", anAccountAnd([](Stage& stage) { stage.platform.userAnswers = 1; }), request, false, AccountsErrorAccessDenied},
    {"AnExtension", anAccountAnd([](Stage& stage) {
       stage.addRecord(true);
       stage.askFor({"email", "user_likes"});
     }),
     request, true},
    {"ACoveredRequest", anAccountAnd([](Stage& stage) { stage.addRecord(true); }), request, true},
    {"ARequestOfARefusedClient", anAccountAnd([](Stage& stage) { stage.addRecord(false); }), request, false},
    {"AnInvalidRequest", anAccountAnd([](Stage& stage) { stage.options = nullptr; }), request, false,
     AccountsErrorInvalidOptions},
    {"ARequestWithoutAnAccount", [](Stage&) {}, request, false, AccountsErrorAccountNotFound},
    {"AllAccountsAccess", [](Stage& stage) { stage.client->hasAllAccess = true; }, request, true},
    {"DefaultAccess", anAccountAnd([](Stage& stage) { stage.client->hasDefaultAccess = true; }), request, true},
    {"DefaultAccessWithoutAnAccount", [](Stage& stage) { stage.client->hasDefaultAccess = true; }, request, true},
    {"ADirectAuthorization", anAccountAnd([](Stage& stage) { stage.addRecord(false); }), authorize, true},
    {"ADirectAuthorizationOfAnUnknownClient", anAccount, authorize, true},
    {"ADirectAuthorizationWithoutAnAccount", [](Stage&) {}, authorize, false},
    {"ARevocation", anAccountAnd([](Stage& stage) { stage.addRecord(true); }), revoke, true},
    {"ARevocationOfAnUnknownClient", anAccount, revoke, true},
    {"ARevocationOfAll", anAccountAnd([](Stage& stage) { stage.addRecord(true); }), revokeAll, true},
    {"ARevocationOfAllWithoutAnAccount", [](Stage&) {}, revokeAll, true},
};

bool holdsAGrant(const Stage& stage) { return stage.store->record && stage.store->record->isGranted(); }

class WhenMemoryRunsOut : public ::testing::TestWithParam<Operation> {
 protected:
  // Runs the operation under the plan. Answers whether an allocation failed.
  static bool run(const AllocationPlan& plan, const std::function<void(FrugalPlatform&)>& end) {
    const Operation& operation = GetParam();
    Stage& stage = newStage();
    operation.prepare(stage);
    const bool heldAGrant = holdsAGrant(stage);
    bool threw = false;
    planAllocations(plan);
    try {
      AccessCompletion completion = stage.completion();
      const CountedAllocations counted;
      operation.perform(stage, std::move(completion));
    } catch (...) {
      threw = true;
    }
    end(stage.platform);
    const bool failed = anAllocationFailed();
    planAllocations({});

    EXPECT_FALSE(threw) << "An exception left the operation.";
    EXPECT_FALSE(stage.platform.aHandlerThrew()) << "An exception left the handler of the server's answer.";
    EXPECT_EQ(stage.told.calls, 1);
    if (stage.told.errorCode == AccountsErrorUnexpectedFailure) {
      EXPECT_FALSE(stage.told.granted);
      EXPECT_TRUE(stage.told.isUnexpectedFailure);
    } else {
      EXPECT_EQ(stage.told.granted, operation.grants);
      EXPECT_EQ(stage.told.errorCode, operation.errorCode);
    }
    EXPECT_TRUE(stage.told.isOutOfMemory || plan.failing > 1 || !plan.andAllLater);
    const bool isNewGrant = holdsAGrant(stage) && !heldAGrant;
    EXPECT_FALSE(isNewGrant && !stage.told.granted) << "A grant was stored that nobody was told of.";
    return failed;
  }

  static void deliver(FrugalPlatform& platform) { platform.deliverHeldAnswer(); }

  // Until an operation needs no allocation of that number any more. How many it needs.
  static std::size_t walk(bool andAllLater, const std::function<void(FrugalPlatform&)>& end) {
    for (std::size_t n = 1;; ++n) {
      SCOPED_TRACE("allocation " + std::to_string(n));
      if (!run({.failing = n, .andAllLater = andAllLater}, end)) return n - 1;
    }
  }
};

TEST_P(WhenMemoryRunsOut, OneFailingAllocationEndsInOneAnswer) {
  inFreshProcess([] { EXPECT_GE(walk(false, deliver), 2U); });
}

TEST_P(WhenMemoryRunsOut, AllocationsThatAllFailFromSomeMomentOnEndInOneAnswer) {
  inFreshProcess([] { EXPECT_GE(walk(true, deliver), 2U); });
}

INSTANTIATE_TEST_SUITE_P(, WhenMemoryRunsOut, ::testing::ValuesIn(operations), nameOfCase<Operation>);

TEST(AHandlerThatIsDroppedWhenMemoryHasRunOut, IsARefusalAllTheSame) {
  for (const bool andAllLater : {false, true}) {
    for (std::size_t n = 1; n <= 5; ++n) {
      Stage& stage = newStage();
      anAccount(stage);
      stage.platform.holdsAnswers = true;
      request(stage, stage.completion());
      ASSERT_EQ(stage.told.calls, 0);

      planAllocations({.failing = n, .andAllLater = andAllLater});
      stage.platform.dropHeldAnswer();
      planAllocations({});

      EXPECT_EQ(stage.told.calls, 1);
      EXPECT_FALSE(stage.told.granted);
      EXPECT_TRUE(stage.told.isUnexpectedFailure);
    }
  }
}

TEST(APluginObject, IsMadeWholeOrNotAtAllWhenMemoryRunsOut) {
  inFreshProcess([] {
    FrugalPlatform& platform = FrugalPlatform::create();
    std::size_t n = 0;
    std::shared_ptr<PluginUnderTest> plugin;
    while (plugin == nullptr) {
      planAllocations({.failing = ++n});
      try {
        const CountedAllocations counted;
        plugin = std::make_shared<PluginUnderTest>(platform.services());
      } catch (const std::bad_alloc&) {
        // The next round has one allocation more.
      }
    }
    planAllocations({});
    EXPECT_GT(n, 5U);
    EXPECT_TRUE(plugin->_writePermissions().contains("publish"));
  });
}

}  // namespace
}  // namespace palisade
