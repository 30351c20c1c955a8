// Many threads on one plug-in object.

#include <atomic>
#include <barrier>
#include <future>
#include <latch>
#include <string>
#include <thread>
#include <vector>

#include <gmock/gmock.h>

#include "Tests/Unit/Support/Scene.h"

namespace palisade {
namespace {

using ::testing::AnyOf;
using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::IsEmpty;
using ::testing::SizeIs;

constexpr int threadCount = 8;

// Carries `work(number)` out on many threads that start together.
template <typename Work>
void onManyThreads(Work work) {
  std::latch start(threadCount);
  std::vector<std::jthread> threads;
  for (int number = 0; number < threadCount; ++number) {
    threads.emplace_back([&, number] {
      start.arrive_and_wait();
      work(number);
    });
  }
}

// Waits for the one answer of an operation and notices a second one.
class AnswerBox {
 public:
  AccessCompletion completion() {
    return [this](bool granted, const std::optional<Error>& error) {
      if (_calls.fetch_add(1) == 0) _first.set_value({.granted = granted, .error = error});
    };
  }

  CompletionCall wait() { return _answer.get(); }
  int calls() const { return _calls; }

 private:
  std::atomic<int> _calls = 0;
  std::promise<CompletionCall> _first;
  std::future<CompletionCall> _answer = _first.get_future();
};

std::shared_ptr<const FakeClient> numberedClient(FakePlatform& platform, int number) {
  const std::string id = "app" + std::to_string(number);
  return platform.makeClient({.id = id, .bundleID = "org.example." + id, .appName = id});
}

TEST(RequestsOfManyClients, AreEachAnsweredOnceOnOneFreshObject) {
  for (int round = 0; round < 10; ++round) {
    Scene scene;
    scene.addAccount();
    scene.platform.alert.answers = {userAllows()};
    scene.platform.social.authorizationAnswers = {serverGrants({"email"})};
    scene.platform.social.descriptionAnswers = {{.data = R"("see the future")"}};
    scene.platform.deliveries.deliverAutomatically();
    const auto options =
        std::make_shared<const Dictionary>(optionsAskingFor({"email", "publish", "manage_pages", "future"}, "anybody"));

    std::vector<AnswerBox> answers(threadCount);
    onManyThreads([&](int number) {
      AnswerBox& answer = answers[static_cast<std::size_t>(number)];
      scene.plugin->handleAccessRequestToAccountsOfType(scene.facebook, numberedClient(scene.platform, number), options,
                                                        scene.store, true, answer.completion());
      EXPECT_THAT(answer.wait(), isGrant());
    });

    for (const AnswerBox& answer : answers) EXPECT_EQ(answer.calls(), 1);
    const auto records = scene.authorizations.allAuthorizationsForAccountType(*scene.facebook);
    EXPECT_THAT(records, SizeIs(threadCount));
    for (const auto& record : records) EXPECT_EQ(*record->grantedPermissions(), PermissionSet{"email"});
    for (int number = 0; number < threadCount; ++number) {
      const auto entry = scene.platform.keychain.entry("me", "org.example.app" + std::to_string(number));
      ASSERT_NE(entry, nullptr);
      EXPECT_EQ(entry->oauthToken(), "client token");
    }
  }
}

TEST(OperationsOfEveryKind, AreEachAnsweredOnceWhenTheyMeet) {
  for (int round = 0; round < 20; ++round) {
    Scene scene;
    scene.addAccount();
    scene.addRecord({.options = persistentOptions(), .permissions = PermissionSet{"email"}});
    scene.platform.alert.answers = {userAllows(), userRefuses(), userAllows()};
    scene.platform.social.authorizationAnswers = {serverGrants({"email"}), serverCannotBeReached(), serverGrants({"email"})};
    scene.platform.deliveries.deliverAutomatically();
    const auto covered = std::make_shared<const Dictionary>(optionsAskingFor({"email"}));
    const auto extending = std::make_shared<const Dictionary>(optionsAskingFor({"email", "user_likes"}));

    std::vector<AnswerBox> answers(threadCount);
    onManyThreads([&](int number) {
      AnswerBox& answer = answers[static_cast<std::size_t>(number)];
      PluginUnderTest& plugin = *scene.plugin;
      switch (number % 5) {
        case 0: plugin.revokeAccessToAccountsOfType(scene.facebook, scene.client, scene.store, answer.completion()); break;
        case 1: plugin.revokeAllAccessToAccountsOfType(scene.facebook, scene.store, answer.completion()); break;
        case 2: plugin.authorizeAccessToAccountsOfType(scene.facebook, scene.client, scene.store, answer.completion()); break;
        case 3:
          plugin.handleAccessRequestToAccountsOfType(scene.facebook, scene.client, covered, scene.store, true,
                                                     answer.completion());
          break;
        default:
          plugin.handleAccessRequestToAccountsOfType(scene.facebook, scene.client, extending, scene.store, true,
                                                     answer.completion());
      }
      answer.wait();
    });

    for (const AnswerBox& answer : answers) EXPECT_EQ(answer.calls(), 1);
    EXPECT_EQ(scene.platform.alert.standingAlerts(), 0U);
  }
}

TEST(SeveralPrompts, StandAtOnceEachOnItsOwnThread) {
  Scene scene;
  scene.addAccount();
  scene.platform.alert.answers = {userRefuses()};
  // Nobody answers before every thread has its alert: one lock around the prompt would keep them waiting for ever.
  std::barrier allShown(threadCount);
  scene.platform.alert.whileShown = [&] {
    allShown.arrive_and_wait();
    EXPECT_EQ(scene.platform.alert.standingAlerts(), std::size_t{threadCount});
    allShown.arrive_and_wait();
  };
  const auto options = std::make_shared<const Dictionary>(optionsAskingFor({"email"}));

  std::vector<AnswerBox> answers(threadCount);
  onManyThreads([&](int number) {
    scene.plugin->handleAccessRequestToAccountsOfType(scene.facebook, numberedClient(scene.platform, number), options,
                                                      scene.store, true,
                                                      answers[static_cast<std::size_t>(number)].completion());
  });

  for (AnswerBox& answer : answers) {
    EXPECT_THAT(answer.wait(), isRefusalWith(accountsError(7)));
    EXPECT_EQ(answer.calls(), 1);
  }
}

// A framework that keeps the handler of its last request for the test to call.
class HandlerKeepingFramework final : public SocialFramework {
 public:
  explicit HandlerKeepingFramework(SocialFramework& framework) : _framework(framework) {}

  FacebookRequestHandler handler;

  std::shared_ptr<FacebookSession> makeFacebookSession() override { return _framework.makeFacebookSession(); }
  std::shared_ptr<FacebookAuthorizationRequest> makeFacebookAuthorizationRequest(const std::string&, const std::string&,
                                                                                 PermissionSetRef,
                                                                                 const std::optional<std::string>&) override {
    return std::make_shared<Request>(*this);
  }
  std::shared_ptr<FacebookPermissionDescriptionRequest> makeFacebookPermissionDescriptionRequest(
      PermissionSetRef permissions, const std::optional<std::string>& audience) override {
    return _framework.makeFacebookPermissionDescriptionRequest(std::move(permissions), audience);
  }

 private:
  class Request final : public FacebookAuthorizationRequest {
   public:
    explicit Request(HandlerKeepingFramework& framework) : _framework(framework) {}
    void setAccessToken(std::optional<std::string>) override {}
    void performRequestWithHandler(FacebookRequestHandler handler) override { _framework.handler = std::move(handler); }

   private:
    HandlerKeepingFramework& _framework;
  };

  SocialFramework& _framework;
};

TEST(AnAnswerOnManyThreadsAtOnce, IsHeardOnce) {
  for (int round = 0; round < 30; ++round) {
    Scene scene;
    HandlerKeepingFramework framework(scene.platform.social);
    PlatformServices services = scene.platform.services();
    services.social = &framework;
    const auto plugin = std::make_shared<PluginUnderTest>(services);
    scene.addAccount();
    scene.platform.alert.answers = {userAllows()};
    AnswerBox answer;
    plugin->handleAccessRequestToAccountsOfType(scene.facebook, scene.client,
                                                std::make_shared<const Dictionary>(optionsAskingFor({"email"})), scene.store,
                                                true, answer.completion());
    EXPECT_EQ(answer.calls(), 0);

    onManyThreads([&](int number) {
      const ServerAnswer given = number % 2 == 0 ? serverGrants({"email"}) : serverCannotBeReached();
      framework.handler(given.data, std::nullopt, given.error);
    });

    const CompletionCall first = answer.wait();
    EXPECT_EQ(answer.calls(), 1);
    EXPECT_EQ(scene.record().has_value(), first.granted) << "What the daemon was told is what is stored.";
    EXPECT_EQ(scene.platform.keychain.entry("me", "org.example.photos") != nullptr, first.granted);
  }
}

TEST(AccountObjects, AreNotSharedByRequests) {
  Scene scene;
  scene.addAccount();
  const auto one = scene.plugin->_accountOfType(scene.facebook, *scene.store);
  const auto other = scene.plugin->_accountOfType(scene.facebook, *scene.store);
  EXPECT_NE(one, other);
}

}  // namespace
}  // namespace palisade
