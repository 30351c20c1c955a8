// A plug-in's own test, written with nothing but the installed headers: the user allows, and the plug-in grants.

#include <cstdio>
#include <memory>

#include "Platform/AccountAccessPlugin.h"
#include "Platform/AccountType.h"
#include "Testing/FakePlatform.h"

extern "C" const palisade::AccountAccessPluginModule* accountAccessPluginModule(std::uint32_t daemonABINumber);

int main() {
  using namespace palisade;
  const auto calendar = std::make_shared<const AccountType>("org.example.accounttype.calendar");
  FakePlatform& platform = FakePlatform::create(nullptr);
  platform.store->addAccount({.id = "1", .type = calendar->identifier(), .description = "my calendar"});
  platform.alert.answers = {userAllows()};
  const auto planner = platform.makeClient({.id = "planner", .bundleID = "org.example.planner", .appName = "Planner"});

  const auto plugin = accountAccessPluginModule(AccountAccessPluginABINumber)->create(platform.services());
  platform.run([&] {
    plugin->handleAccessRequestToAccountsOfType(calendar, planner, nullptr, platform.store, true, platform.completion());
  });
  const bool isGranted = platform.completions().size() == 1 && platform.completions().front().granted;
  std::puts(isGranted ? "granted" : "refused");
  return isGranted ? 0 : 1;
}
