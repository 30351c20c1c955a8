// What is set up once a process: the preferences queue and the registration for environment changes.

#include <algorithm>
#include <atomic>
#include <latch>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

#include <gmock/gmock.h>

#include "Tests/Unit/Access/FreshProcess.h"
#include "Tests/Unit/Support/Scene.h"

namespace palisade {
namespace {

using ::testing::Contains;
using ::testing::Each;
using ::testing::ElementsAre;
using ::testing::Field;
using ::testing::IsEmpty;
using ::testing::SizeIs;

constexpr const char* queueLabel = "com.veltran.social.facebook.preferencesQueue";

void postEnvironmentChange(FakePlatform& platform) {
  platform.notifications.post("FacebookEnvironmentDidChangeNotification");
  platform.queues.drain();
}

TEST(ThePreferencesSetUp, IsMadeByTheFirstReadAndByNoOther) {
  inFreshProcess([] {
    Scene scene;
    EXPECT_THAT(scene.platform.trace.names(), IsEmpty()) << "A plug-in object alone sets nothing up.";

    scene.plugin->_shouldIgnoreAccessRequest();
    scene.plugin->_shouldIgnoreAccessRequest();
    std::make_shared<PluginUnderTest>(scene.platform.services())->_shouldIgnoreAccessRequest();

    EXPECT_THAT(scene.platform.trace.names(), ElementsAre("Queue.create", "NotificationBus.register", "Preferences.copyValue",
                                                          "Preferences.copyValue", "Preferences.copyValue"));
    const auto queues = scene.platform.trace.named("Queue.create");
    ASSERT_THAT(queues, SizeIs(1));
    EXPECT_EQ(queues[0]["label"], Value(queueLabel));
    EXPECT_THAT(scene.platform.trace.named("NotificationBus.register"),
                ElementsAre(Field(&Event::members,
                                  Dictionary{{"name", "FacebookEnvironmentDidChangeNotification"}, {"queue", queueLabel}})));
  });
}

TEST(ThePreferencesSetUp, IsMadeOnceWhenManyThreadsComeFirst) {
  inFreshProcess([] {
    Scene scene;
    constexpr int threadCount = 16;
    std::latch start(threadCount);
    {
      std::vector<std::jthread> threads;
      for (int number = 0; number < threadCount; ++number) {
        threads.emplace_back([&] {
          const auto plugin = std::make_shared<PluginUnderTest>(scene.platform.services());
          start.arrive_and_wait();
          plugin->_shouldIgnoreAccessRequest();
        });
      }
    }
    EXPECT_THAT(scene.platform.trace.named("Queue.create"), SizeIs(1));
    EXPECT_THAT(scene.platform.trace.named("NotificationBus.register"), SizeIs(1));
    EXPECT_THAT(scene.platform.trace.named("Preferences.copyValue"), SizeIs(threadCount));
  });
}

TEST(AnEnvironmentChange, SynchronisesThePreferencesDomainOnTheQueue) {
  inFreshProcess([] {
    Scene scene;
    scene.plugin->_shouldIgnoreAccessRequest();
    EXPECT_THAT(scene.platform.trace.named("Preferences.synchronize"), IsEmpty());

    postEnvironmentChange(scene.platform);
    postEnvironmentChange(scene.platform);

    EXPECT_THAT(
        scene.platform.trace.named("Preferences.synchronize"),
        ElementsAre(Field(&Event::members, Dictionary{{"queue", queueLabel}, {"domain", "com.veltran.social.facebook"}}),
                    Field(&Event::members, Dictionary{{"queue", queueLabel}, {"domain", "com.veltran.social.facebook"}})));
    EXPECT_THAT(scene.platform.trace.named("Preferences.synchronize"), Each(Field(&Event::thread, "preferences")));
    EXPECT_THAT(logLines(scene.platform.trace), IsEmpty());
  });
}

TEST(AnEnvironmentChange, IsHeardAfterEveryPlugInObjectIsGone) {
  inFreshProcess([] {
    FakePlatform& platform = freshPlatform();
    std::make_shared<PluginUnderTest>(platform.services())->_shouldIgnoreAccessRequest();
    postEnvironmentChange(platform);
    EXPECT_THAT(platform.trace.named("Preferences.synchronize"), SizeIs(1));
  });
}

TEST(AnEnvironmentChange, BeforeTheFirstReadIsNoConcernOfThePlugIn) {
  inFreshProcess([] {
    Scene scene;
    postEnvironmentChange(scene.platform);
    EXPECT_THAT(scene.platform.trace.names(), IsEmpty());
  });
}

TEST(AnEnvironmentChange, ThatCannotBeFollowedIsLoggedAndEndsNothing) {
  inFreshProcess([] {
    Scene scene;
    scene.plugin->_shouldIgnoreAccessRequest();
    scene.platform.faults.clear();
    scene.platform.faults.throwOn("Preferences.synchronize");
    postEnvironmentChange(scene.platform);
    EXPECT_THAT(logLines(scene.platform.trace), ElementsAre(LogLine{3,
                                                                    "_shouldIgnoreAccessRequest",
                                                                    "The access decision failed unexpectedly: %@",
                                                                    {"injected fault in call 1, Preferences.synchronize"},
                                                                    "failure"}));
    EXPECT_FALSE(scene.plugin->_shouldIgnoreAccessRequest()) << "The queue is still there.";
  });
}

TEST(ASetUpThatFails, RefusesTheRequestAndIsTriedAgainWithTheNextOne) {
  for (const char* call : {"Queue.create", "NotificationBus.register"}) {
    inFreshProcess([call] {
      Scene scene;
      scene.addAccount();
      scene.platform.alert.answers = {userAllows()};
      scene.platform.social.authorizationAnswers = {serverGrants({"email"})};
      scene.platform.faults.throwOn(call);

      EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email"})), isUnexpectedFailureAnswer());
      EXPECT_EQ(scene.record(), std::nullopt);

      EXPECT_THAT(scene.requestAccess(optionsAskingFor({"email"})), isGrant());
      EXPECT_THAT(scene.platform.trace.named("Queue.create"), SizeIs(1));
      EXPECT_THAT(scene.platform.trace.named("NotificationBus.register"), SizeIs(1));
    });
  }
}

// Tells whether two calls were ever inside it at once.
class OverlapDetectingStore final : public PreferencesStore {
 public:
  explicit OverlapDetectingStore(PreferencesStore& store) : _store(store) {}

  std::optional<Value> copyValue(std::string_view key, std::string_view domain, PreferencesUser user,
                                 PreferencesHost host) override {
    ++reads;
    const Visit visit(*this);
    return _store.copyValue(key, domain, user, host);
  }

  void synchronize(std::string_view domain) override {
    ++synchronizations;
    const Visit visit(*this);
    _store.synchronize(domain);
  }

  std::atomic<int> reads = 0;
  std::atomic<int> synchronizations = 0;
  std::atomic<int> greatestAtOnce = 0;

 private:
  class Visit {
   public:
    explicit Visit(OverlapDetectingStore& store) : _store(store) {
      const int atOnce = ++_store._visitors;
      if (atOnce > _store.greatestAtOnce) _store.greatestAtOnce = atOnce;
      std::this_thread::yield();
    }
    ~Visit() { --_store._visitors; }

    Visit(const Visit&) = delete;
    Visit& operator=(const Visit&) = delete;

   private:
    OverlapDetectingStore& _store;
  };

  PreferencesStore& _store;
  std::atomic<int> _visitors = 0;
};

TEST(APreferenceRead, NeverOverlapsTheResynchronisationOfTheDomain) {
  inFreshProcess([] {
    FakePlatform& platform = freshPlatform();
    // Lives as long as the process, like every service.
    auto& store = *new OverlapDetectingStore(platform.preferences);
    PlatformServices services = platform.services();
    services.preferences = &store;
    const auto plugin = std::make_shared<PluginUnderTest>(services);
    plugin->_shouldIgnoreAccessRequest();

    constexpr int threadCount = 4;
    constexpr int rounds = 50;
    std::latch start(2 * threadCount);
    {
      std::vector<std::jthread> threads;
      for (int number = 0; number < threadCount; ++number) {
        threads.emplace_back([&] {
          start.arrive_and_wait();
          for (int round = 0; round < rounds; ++round) plugin->_shouldIgnoreAccessRequest();
        });
        threads.emplace_back([&] {
          start.arrive_and_wait();
          for (int round = 0; round < rounds; ++round) {
            platform.notifications.post("FacebookEnvironmentDidChangeNotification");
          }
        });
      }
    }
    platform.queues.drain();

    EXPECT_EQ(store.reads, 1 + threadCount * rounds);
    EXPECT_EQ(store.synchronizations, threadCount * rounds);
    EXPECT_EQ(store.greatestAtOnce, 1);
  });
}

}  // namespace
}  // namespace palisade
