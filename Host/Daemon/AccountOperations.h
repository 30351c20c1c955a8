#pragma once

/// The daemon's decisions about who may call what, and the order in which operations run. Everything about access itself is the
/// plug-in's.
///
/// Threads: see `AccountsService`. One operation of a client at a time, in order; operations of different clients run beside
/// each other. A revocation waits for no operation: it withdraws those of its client, and what they still bring is not kept.
/// Ownership: borrows its parts. Errors: `BusFailure`.
//  Contents: 1 Requests (AccountOperations.cpp)  2 Management (AccountOperationsManagement.cpp)

#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <vector>

#include "Host/Accounts/AccessHistory.h"
#include "Host/Accounts/SqliteAccountStore.h"
#include "Host/Bus/AccountsService.h"
#include "Host/Daemon/AlertCoolDown.h"
#include "Host/Daemon/AlertScheduler.h"
#include "Host/Daemon/ClientLanes.h"
#include "Host/Daemon/Operation.h"
#include "Host/Identity/ClientRegistry.h"
#include "Host/Keychain/Keychain.h"
#include "Host/Preferences/TomlPreferencesStore.h"
#include "Host/Vantad/Outbox.h"
#include "Platform/AccountAccessPlugin.h"

namespace palisade {

class AccountOperations final : public AccountsService {
 public:
  /// The plug-in that serves an account type, or null.
  using PluginFinder = std::function<std::shared_ptr<AccountAccessPlugin>(std::string_view accountType)>;

  struct Parts {
    SqliteAccountStore& store;
    AccessHistory& history;
    Keychain& keychain;
    Outbox& outbox;
    const ClientRegistry& clients;
    AlertCoolDown& coolDown;
    AlertScheduler& alerts;
    TomlPreferencesStore& preferences;
    PluginFinder pluginFor;
    std::function<Rows()> revocations;
    std::function<Dictionary()> status;
  };

  explicit AccountOperations(Parts parts) : _parts(std::move(parts)), _lanes(longestLane) {}

  std::optional<std::string> knownApplication(const BusCaller& caller) override;
  std::string identify(const BusCaller& caller) override { return clientOf(caller)->id(); }

  AccessOutcome requestAccess(const BusCaller& caller, const std::string& accountType,
                              const std::shared_ptr<const Dictionary>& accessOptions, PendingRequest& request) override;
  AccessOutcome authorize(const BusCaller& caller, const std::string& accountType, const std::string& client,
                          PendingRequest& request) override;
  std::string credential(const BusCaller& caller, const std::string& accountType) override;

  Rows listAccounts(const BusCaller& caller, const std::string& accountType) override;
  std::shared_ptr<const void> admitToken(const BusCaller& caller) override;
  std::string addAccount(const BusCaller& caller, const std::string& accountType, const std::string& username,
                         const std::function<std::string()>& readToken) override;
  void removeAccount(const BusCaller& caller, const std::string& id) override;

  Rows listGrants(const BusCaller& caller, const std::string& accountType) override;
  void revoke(const BusCaller& caller, const std::string& accountType, const std::string& client) override;
  void revokeAll(const BusCaller& caller, const std::string& accountType) override;

  Rows history(const BusCaller& caller, std::uint32_t limit, const std::optional<std::string>& client) override;
  Rows listRevocations(const BusCaller& caller) override;
  Rows listClients(const BusCaller& caller) override;
  std::optional<Value> preference(const BusCaller& caller, const std::string& domain, const std::string& key) override;
  void setPreference(const BusCaller& caller, const std::string& domain, const std::string& key,
                     const std::optional<Value>& value) override;
  Dictionary status(const BusCaller& caller) override;

  bool mayPost(const BusCaller& caller) override;

  void close(std::uint64_t requestIdentifier) override;
  void callerLeft(const std::string& uniqueName) override;

  /// The operation whose turn it is among a client's, or null.
  std::shared_ptr<Operation> operationOf(const std::string& clientID);

  /// Withdraws everything that waits; the daemon is about to end.
  void withdrawAll();

 private:
  static constexpr std::size_t longestLane = 8;

  /// An operation that may be withdrawn, and by whom.
  struct Running {
    std::shared_ptr<Operation> operation;
    std::string caller;
    std::string client;
    std::uint64_t request;
    bool hasTurn = false;
  };
  using Withdrawable = std::function<bool(const Running&)>;
  using PluginCall = std::function<void(AccountAccessPlugin&, const std::shared_ptr<const AccountType>&,
                                        const std::shared_ptr<AccountStore>&, AccessCompletion)>;

  std::shared_ptr<const RegisteredClient> clientOf(const BusCaller& caller);
  void refuseUnlessManager(const BusCaller& caller);
  std::shared_ptr<const RegisteredClient> registeredClient(const std::string& id) const;
  std::shared_ptr<AccountAccessPlugin> pluginFor(const std::string& accountType) const;

  AccessOutcome carryOut(const BusCaller& caller, const std::shared_ptr<const RegisteredClient>& client,
                         const std::string& accountType, const std::optional<std::string>& appID, PendingRequest& request,
                         const PluginCall& call);
  void manage(const std::string& accountType, const PluginCall& call);
  std::vector<std::shared_ptr<Operation>> operationsThat(const Withdrawable& areMeant);
  void withdraw(const Withdrawable& isMeant);
  void revokeOperations(const Withdrawable& areMeant);
  bool hasToken(const AccountRecord& account);

  Parts _parts;
  ClientLanes _lanes;
  std::mutex _mutex;
  std::map<std::string, std::shared_ptr<const RegisteredClient>> _clientsByConnection;
  /// Connections that are not their process's own, and how that was told.
  std::map<std::string, std::string> _strangers;
  std::map<Operation*, Running> _running;
  /// How many tokens each connection is sending.
  std::map<std::string, std::size_t> _tokenTransfers;
  /// Held by the addition of an account, from the look for one of its name until it has its token.
  std::mutex _addition;
};

}  // namespace palisade
