// A plug-in that does what the app ID of a request says, so that every way an operation can end is seen by the scenario runner.

#include <atomic>
#include <cstdio>
#include <cstdlib>
#include <future>
#include <memory>
#include <stdexcept>
#include <string>
#include <utility>

#include "Platform/AccountAccessPlugin.h"
#include "Platform/AccountConstants.h"
#include "Platform/AccountStore.h"
#include "Platform/AccountType.h"
#include "Platform/AuthorizationManager.h"
#include "Platform/Log.h"
#include "Platform/SerialQueue.h"
#include "Platform/StringTable.h"

namespace palisade {
namespace {

std::atomic<int> requestsInThisProcess = 0;
std::atomic<int> objectsInThisProcess = 0;

[[noreturn]] void waitForEver() {
  std::promise<void>().get_future().wait();
  std::abort();
}

class ReplayTestPlugin final : public AccountAccessPlugin {
 public:
  explicit ReplayTestPlugin(const PlatformServices& services) : AccountAccessPlugin(services) {}

  void handleAccessRequestToAccountsOfType(std::shared_ptr<const AccountType> accountType,
                                           std::shared_ptr<const Client> forClient,
                                           std::shared_ptr<const Dictionary> withOptions, std::shared_ptr<AccountStore> store,
                                           bool, AccessCompletion completion) override {
    const Value* appID = withOptions == nullptr ? nullptr : withOptions->find(FacebookAppIdKey);
    const std::string wish = appID == nullptr || appID->string() == nullptr ? "" : *appID->string();
    ++requestsInThisProcess;
    if (wish == "crash") std::abort();
    if (wish == "exit") std::exit(3);
    if (wish == "print") std::puts("a plug-in that prints");
    if (wish == "wait") waitForEver();
    if (wish == "return") return;
    if (wish == "greet") {
      log().record({"greet"}, LogLevel::notice, "%@", "greeting", strings().localizedString("GREETING", "none", "Localizable"));
    }
    if (wish == "record") {
      ClientAuthorization record(forClient);
      record.setOptions(withOptions);
      store->authorizationManager().setAuthorization(record, forClient, *accountType);
    }
    if (wish == "queue") {
      _queue = queues().makeSerialQueue("org.example.queue");
      _queue->async([self = shared_from_this(), this] {
        log().record({"later"}, LogLevel::debug, "%@ of %d", "first, second", std::optional<std::string>(), std::size_t{2});
      });
    }
    if (wish == "throw on a queue") {
      _queue = queues().makeSerialQueue("org.example.queue");
      _queue->async([] { throw std::runtime_error("nobody is there to catch this"); });
    }
    completion(requestsInThisProcess == 1, Error{.domain = std::string(AccountsErrorDomain), .code = 7});
    if (wish == "complete twice") completion(false, std::nullopt);
    if (wish == "complete and wait") waitForEver();
  }

  void authorizeAccessToAccountsOfType(std::shared_ptr<const AccountType>, std::shared_ptr<const Client>,
                                       std::shared_ptr<AccountStore>, AccessCompletion completion) override {
    completion(true, std::nullopt);
  }

  void revokeAccessToAccountsOfType(std::shared_ptr<const AccountType>, std::shared_ptr<const Client>,
                                    std::shared_ptr<AccountStore>, AccessCompletion completion) override {
    completion(true, std::nullopt);
  }

  void revokeAllAccessToAccountsOfType(std::shared_ptr<const AccountType>, std::shared_ptr<AccountStore>,
                                       AccessCompletion withCompletion) override {
    withCompletion(true, std::nullopt);
  }

 private:
  std::shared_ptr<SerialQueue> _queue;
};

bool supports(std::string_view identifier) noexcept { return identifier == "org.example.type"; }

// The third object of a process cannot be made.
std::shared_ptr<AccountAccessPlugin> create(const PlatformServices& services) noexcept {
  if (++objectsInThisProcess > 2) return nullptr;
  return std::make_shared<ReplayTestPlugin>(services);
}

}  // namespace
}  // namespace palisade

extern "C" PALISADE_EXPORT const palisade::AccountAccessPluginModule* accountAccessPluginModule(std::uint32_t) {
  static const palisade::AccountAccessPluginModule module{.supportsAccountTypeWithIdentifier = palisade::supports,
                                                          .create = palisade::create};
  return &module;
}
