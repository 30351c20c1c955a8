#pragma once

/// The interface between the account daemon and a plug-in that decides about access to one type of account.
///
/// A plug-in is a shared object that exports one function, `accountAccessPluginModule`. The daemon loads the object, reads the
/// ABI number that the function answers, asks whether the module serves an account type, and makes one plug-in object.
/// Threads: the daemon calls every operation from threads of its own, several at a time. An operation may block its thread for
/// as long as a user or a server takes. Completions run on the calling thread or on a thread that carries a server's answer.
/// Ownership: plug-in objects are shared; a pending callback keeps its object alive. Accounts, clients and stores that are
/// handed in live at least until the completion has been called. Errors: an operation never throws and calls its completion
/// exactly once. "Access denied" is an answer; whatever fails unexpectedly, in the plug-in or in a service, is answered with
/// (false, `AccountsErrorUnexpectedFailure`), unless the outcome has been stored: then the answer is what was stored.

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string_view>

#include "Platform/Error.h"
#include "Platform/PlatformServices.h"
#include "Platform/Value.h"

namespace palisade {

class AccountStore;
class AccountType;
class Client;

/// The daemon's completion: whether access is granted, and an error or none.
using AccessCompletion = std::function<void(bool granted, const std::optional<Error>& error)>;

class AccountAccessPlugin : public std::enable_shared_from_this<AccountAccessPlugin> {
 public:
  virtual ~AccountAccessPlugin() = default;

  AccountAccessPlugin(const AccountAccessPlugin&) = delete;
  AccountAccessPlugin& operator=(const AccountAccessPlugin&) = delete;

  /// Decides whether `forClient` may use the account with the permissions and the audience of `withOptions` (none is a null
  /// pointer), asking the user where that is needed.
  virtual void handleAccessRequestToAccountsOfType(std::shared_ptr<const AccountType> accountType,
                                                   std::shared_ptr<const Client> forClient,
                                                   std::shared_ptr<const Dictionary> withOptions,
                                                   std::shared_ptr<AccountStore> store, bool allowUserInteraction,
                                                   AccessCompletion completion) = 0;

  /// Grants access without asking the user, on the strength of the client's earlier record.
  virtual void authorizeAccessToAccountsOfType(std::shared_ptr<const AccountType> accountType,
                                               std::shared_ptr<const Client> forClient, std::shared_ptr<AccountStore> store,
                                               AccessCompletion completion) = 0;

  /// Takes back what one client was granted. The granted flag says that the revocation was handled.
  virtual void revokeAccessToAccountsOfType(std::shared_ptr<const AccountType> accountType,
                                            std::shared_ptr<const Client> forClient, std::shared_ptr<AccountStore> store,
                                            AccessCompletion completion) = 0;

  /// Takes back what every client was granted. The granted flag says that the revocation was handled.
  virtual void revokeAllAccessToAccountsOfType(std::shared_ptr<const AccountType> accountType,
                                               std::shared_ptr<AccountStore> store, AccessCompletion withCompletion) = 0;

 protected:
  /// Throws `std::invalid_argument` when the services are of another ABI number or one of them is missing.
  explicit AccountAccessPlugin(const PlatformServices& services);

  Log& log() const { return *_services.log; }
  KeychainManager& keychain() const { return *_services.keychain; }
  SocialFramework& social() const { return *_services.social; }
  SystemAlert& alert() const { return *_services.alert; }
  PreferencesStore& preferences() const { return *_services.preferences; }
  NotificationBus& notifications() const { return *_services.notifications; }
  SerialQueueFactory& queues() const { return *_services.queues; }
  JsonParser& json() const { return *_services.json; }
  StringTable& strings() const { return *_services.strings; }

 private:
  PlatformServices _services;
};

/// What a module says of itself. The first two members keep their place in every ABI.
struct AccountAccessPluginModule {
  std::uint32_t abiNumber = AccountAccessPluginABINumber;
  std::uint32_t size = sizeof(AccountAccessPluginModule);

  /// Whether the module's plug-in serves the account type.
  bool (*supportsAccountTypeWithIdentifier)(std::string_view identifier) noexcept = nullptr;

  /// Makes a plug-in object, or none when the base class refuses the services.
  std::shared_ptr<AccountAccessPlugin> (*create)(const PlatformServices& services) noexcept = nullptr;
};

/// The module's entry point: `extern "C" const AccountAccessPluginModule* accountAccessPluginModule(std::uint32_t)`. It is
/// given the daemon's ABI number and answers a structure that lives as long as the process. A module that cannot serve that
/// number answers its own, and the daemon reads nothing else of it.
using AccountAccessPluginModuleEntry = const AccountAccessPluginModule* (*)(std::uint32_t daemonABINumber);
inline constexpr const char* AccountAccessPluginModuleSymbol = "accountAccessPluginModule";

/// Put before the entry point: modules are built with hidden visibility and export nothing else of the interface.
#define PALISADE_EXPORT __attribute__((visibility("default")))

}  // namespace palisade
