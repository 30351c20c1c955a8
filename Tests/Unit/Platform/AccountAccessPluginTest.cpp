// The base of every plug-in takes complete services of its own ABI number and no others.

#include "Platform/AccountAccessPlugin.h"

#include <gmock/gmock.h>

#include "Host/Json/Json.h"
#include "Testing/FakePlatform.h"

namespace palisade {
namespace {

using ::testing::AllOf;
using ::testing::HasSubstr;
using ::testing::ThrowsMessage;

class PluginOfNothing final : public AccountAccessPlugin {
 public:
  explicit PluginOfNothing(const PlatformServices& services) : AccountAccessPlugin(services) {}

  void handleAccessRequestToAccountsOfType(std::shared_ptr<const AccountType>, std::shared_ptr<const Client>,
                                           std::shared_ptr<const Dictionary>, std::shared_ptr<AccountStore>, bool,
                                           AccessCompletion) override {}
  void authorizeAccessToAccountsOfType(std::shared_ptr<const AccountType>, std::shared_ptr<const Client>,
                                       std::shared_ptr<AccountStore>, AccessCompletion) override {}
  void revokeAccessToAccountsOfType(std::shared_ptr<const AccountType>, std::shared_ptr<const Client>,
                                    std::shared_ptr<AccountStore>, AccessCompletion) override {}
  void revokeAllAccessToAccountsOfType(std::shared_ptr<const AccountType>, std::shared_ptr<AccountStore>,
                                       AccessCompletion) override {}

  using AccountAccessPlugin::alert;
  using AccountAccessPlugin::json;
  using AccountAccessPlugin::keychain;
  using AccountAccessPlugin::log;
  using AccountAccessPlugin::notifications;
  using AccountAccessPlugin::preferences;
  using AccountAccessPlugin::queues;
  using AccountAccessPlugin::social;
  using AccountAccessPlugin::strings;
};

FakePlatform& somePlatform() { return FakePlatform::create(std::make_shared<NlohmannJsonParser>()); }

TEST(CompleteServices, ReachThePluginAsTheyWereGiven) {
  const PlatformServices services = somePlatform().services();
  const PluginOfNothing plugin(services);

  EXPECT_EQ(&plugin.log(), services.log);
  EXPECT_EQ(&plugin.keychain(), services.keychain);
  EXPECT_EQ(&plugin.social(), services.social);
  EXPECT_EQ(&plugin.alert(), services.alert);
  EXPECT_EQ(&plugin.preferences(), services.preferences);
  EXPECT_EQ(&plugin.notifications(), services.notifications);
  EXPECT_EQ(&plugin.queues(), services.queues);
  EXPECT_EQ(&plugin.json(), services.json);
  EXPECT_EQ(&plugin.strings(), services.strings);
}

TEST(ServicesOfAnotherABINumber, AreRefusedWithBothNumbers) {
  for (const std::uint32_t number : {0u, AccountAccessPluginABINumber + 1, 4294967295u}) {
    PlatformServices services = somePlatform().services();
    services.abiNumber = number;

    EXPECT_THAT(
        [&] { const PluginOfNothing plugin(services); },
        ThrowsMessage<std::invalid_argument>(AllOf(HasSubstr("ABI number " + std::to_string(number)),
                                                   HasSubstr("built for " + std::to_string(AccountAccessPluginABINumber)))));
  }
}

TEST(ServicesWithoutOneOfThem, AreRefusedWithItsName) {
  const struct {
    const char* name;
    void (*takeAway)(PlatformServices&);
  } cases[] = {
      {"log", [](PlatformServices& services) { services.log = nullptr; }},
      {"keychain", [](PlatformServices& services) { services.keychain = nullptr; }},
      {"social", [](PlatformServices& services) { services.social = nullptr; }},
      {"alert", [](PlatformServices& services) { services.alert = nullptr; }},
      {"preferences", [](PlatformServices& services) { services.preferences = nullptr; }},
      {"notifications", [](PlatformServices& services) { services.notifications = nullptr; }},
      {"queues", [](PlatformServices& services) { services.queues = nullptr; }},
      {"json", [](PlatformServices& services) { services.json = nullptr; }},
      {"strings", [](PlatformServices& services) { services.strings = nullptr; }},
  };
  for (const auto& [name, takeAway] : cases) {
    PlatformServices services = somePlatform().services();
    takeAway(services);

    EXPECT_THAT([&] { const PluginOfNothing plugin(services); },
                ThrowsMessage<std::invalid_argument>(HasSubstr("lack '" + std::string(name) + "'")));
  }
}

}  // namespace
}  // namespace palisade
