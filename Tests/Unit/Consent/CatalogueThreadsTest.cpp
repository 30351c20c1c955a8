// The catalogue's sets are filled on first use by whatever thread comes first, without a lock.

#include <gmock/gmock.h>

#include <latch>
#include <thread>

#include "Tests/Unit/Consent/ConsentScene.h"
#include "Tests/Unit/Consent/KnownPermissions.h"

namespace palisade {
namespace {

using ::testing::Each;
using ::testing::Eq;
using ::testing::Optional;
using ::testing::StartsWith;
using ::testing::UnorderedElementsAreArray;

constexpr std::size_t threadCount = 8;

using Sets = std::array<const PermissionSet*, 4>;

// What every one of many threads gets that ask a fresh plug-in all at once.
std::vector<Sets> setsSeenByManyThreads(const PluginUnderTest& plugin) {
  std::vector<Sets> seen(threadCount);
  std::latch together(threadCount);
  std::vector<std::jthread> threads;
  for (Sets& mine : seen) {
    threads.emplace_back([&] {
      together.arrive_and_wait();
      mine = {&plugin._basicReadPermissions(), &plugin._extendedReadPermissions(), &plugin._writePermissions(),
              &plugin._managePermissions()};
    });
  }
  threads.clear();
  return seen;
}

TEST(TheCataloguesSets, AreTheSameObjectsForEveryThreadThatFillsThemAtOnce) {
  FakePlatform& platform = freshPlatform();
  for (int round = 0; round < 200; ++round) {
    const auto plugin = std::make_shared<PluginUnderTest>(platform.services());
    const std::vector<Sets> seen = setsSeenByManyThreads(*plugin);

    ASSERT_THAT(seen, Each(Eq(seen.front())));
    ASSERT_THAT(*seen.front()[0], UnorderedElementsAreArray(known::basicRead));
    ASSERT_THAT(*seen.front()[1], UnorderedElementsAreArray(known::extendedRead()));
    ASSERT_THAT(*seen.front()[2], UnorderedElementsAreArray(known::write));
    ASSERT_THAT(*seen.front()[3], UnorderedElementsAreArray(known::manage));
  }
}

TEST(TheCataloguesSets, AreFilledOnce) {
  const auto plugin = Scene().plugin;
  const PermissionSet& first = plugin->_writePermissions();

  EXPECT_EQ(&plugin->_writePermissions(), &first);
}

TEST(TwoPlugins, HaveACatalogueEach) {
  const auto one = Scene().plugin;
  const auto other = Scene().plugin;

  EXPECT_NE(&one->_writePermissions(), &other->_writePermissions());
  EXPECT_EQ(one->_writePermissions(), other->_writePermissions());
}

TEST(ASentenceComposedByManyThreadsAtOnce, IsTheSameForAll) {
  const PermissionSet permissions{"user_likes", "friends_likes", "email", "publish_actions", "manage_pages", "create_event"};
  for (int round = 0; round < 20; ++round) {
    ConsentScene scene;
    std::vector<std::optional<std::string>> messages(threadCount);
    std::latch together(threadCount);
    {
      std::vector<std::jthread> threads;
      for (std::optional<std::string>& mine : messages) {
        threads.emplace_back([&] {
          together.arrive_and_wait();
          mine = scene.plugin->_constructUserMessageForPermissions(permissions, std::nullopt, "Photos", scene.account);
        });
      }
    }
    ASSERT_THAT(messages.front(), Optional(StartsWith("ACCOUNT_ACCESS_THREE_PERMISSION_FORMAT<Photos; ")));
    ASSERT_THAT(messages, Each(messages.front()));
  }
}

}  // namespace
}  // namespace palisade
