#pragma once

/// The daemon's accounts, what each client was granted or refused, and the history of its requests, in one SQLite store.
///
/// Threads: every operation may be called from any thread. Writes run one at a time, reads beside them; nothing is held while
/// the client directory or the change listener is called. Ownership: borrows the directory, which outlives it. Accounts and
/// records are handed out as detached copies.
/// Errors: a store that cannot be opened or read is a `SqliteError`. A write answers an error in `StoreErrorDomain`, or throws
/// it where an operation says so; after either nothing has changed. A record that is damaged is never handed out as a grant:
/// its look-up throws, a listing shows it as a refusal, and the next write replaces it.
//  Contents: 1 Opening, accounts (SqliteAccountStore.cpp)  2 Authorizations (SqliteAccountStoreAuthorizations.cpp)
//  3 Intents (SqliteAccountStoreIntents.cpp)  4 History (SqliteAccountStoreHistory.cpp); the prepared queries of all four are
//  in SqliteAccountStoreStatements.h.

#include <filesystem>
#include <functional>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "Host/Accounts/Intent.h"
#include "Host/Sqlite/Database.h"
#include "Platform/AccountStore.h"
#include "Platform/AuthorizationManager.h"
#include "Platform/Date.h"
#include "Platform/Error.h"
#include "Platform/Log.h"

namespace palisade {

class ClientDirectory;
struct AuthorizationRow;

/// What a change listener is told, after the change has been stored, on the thread that made it. Two changes by two threads may
/// be told in either order; a listener that wants the content looks it up.
struct StoreChange {
  enum class Kind { accounts, authorizations };
  Kind kind = Kind::accounts;
  std::string accountTypeIdentifier = {};
  std::optional<std::string> clientID = std::nullopt;  ///< none: every client, or no client's matter
};

struct AccountStoreOptions {
  std::filesystem::path path;
  DamagedStore onDamage = DamagedStore::refuse;
  std::function<void(const StoreChange&)> onChange = nullptr;
  /// Called on the thread that is about to read the store's file or to write it, which may take as long as a disk does. What is
  /// kept in memory is read without it.
  std::function<void()> beforeDisk = [] {};
};

struct AccountRecord {
  std::string id;
  std::string accountTypeIdentifier;
  std::string username;
  std::string description;
};

/// A record with what the platform's records do not say.
struct StoredAuthorization {
  std::string clientID;
  std::string accountTypeIdentifier;
  std::shared_ptr<ClientAuthorization> record;
  Date updatedAt;
  bool isAnsweredByNobody = false;
  bool isDamaged = false;
};

/// One answer, or several of a client that are equal and follow each other.
struct HistoryEntry {
  Date first = {};
  Date last = {};
  std::int64_t count = 1;
  std::string accountTypeIdentifier;
  std::optional<std::string> bundleID;
  bool granted = false;
  bool userPrompted = false;
  double elapsedSeconds = 0.0;  ///< of the last one
};

struct HistoryFilter {
  std::size_t limit = 100;
  std::optional<std::string> bundleID = std::nullopt;  ///< none: every client's
};

class SqliteAccountStore final : public AccountStore, public AuthorizationManager {
 public:
  /// How many entries the history keeps, of a client and of all. The oldest go first of those that no person was asked about,
  /// then the oldest of the others.
  static constexpr std::int64_t historyShareOfClient = 100;
  static constexpr std::int64_t historyCapacity = 2'000;

  /// \name Opening, accounts
  ///@{
  SqliteAccountStore(AccountStoreOptions options, const ClientDirectory& clients);
  ~SqliteAccountStore() override;

  /// Where the damaged store went that this one replaces, if any.
  const std::optional<std::filesystem::path>& damagedStore() const;

  std::vector<std::shared_ptr<Account>> accountsWithAccountTypeIdentifier(std::string_view identifier) override;
  AuthorizationManager& authorizationManager() override { return *this; }

  std::vector<AccountRecord> accounts();

  /// Throws `SqliteError`: with `StoreErrorConstraint` when the user name already has an account of the type.
  AccountRecord addAccount(std::string_view accountTypeIdentifier, std::string_view username, std::string_view description);

  /// False when there is no such account. What was granted for it, and its credentials, are the caller's care. Throws.
  bool removeAccount(std::string_view id);
  ///@}

  /// \name Authorizations
  ///@{
  std::shared_ptr<ClientAuthorization> authorizationForClient(const std::shared_ptr<const Client>& client,
                                                              const AccountType& accountType) override;
  std::vector<std::shared_ptr<ClientAuthorization>> allAuthorizationsForAccountType(const AccountType& accountType) override;
  std::optional<Error> setAuthorization(const ClientAuthorization& authorization,
                                        const std::shared_ptr<const Client>& forClient,
                                        const AccountType& onAccountType) override;
  std::optional<Error> removeAllClientAuthorizationsForAccountType(const AccountType& accountType) override;

  /// Every client's record for the account type, in the store's order.
  std::vector<StoredAuthorization> storedAuthorizations(std::string_view accountTypeIdentifier);

  /// One client's record; none when there is none.
  std::optional<StoredAuthorization> storedAuthorization(std::string_view accountTypeIdentifier, std::string_view clientID);

  /// The records of all clients that had this bundle ID when they were stored.
  std::vector<StoredAuthorization> storedAuthorizationsOfBundle(std::string_view accountTypeIdentifier,
                                                                std::string_view bundleID);

  /// Stores a refusal that no user gave. It counts like any other until it is removed; a grant is not accepted.
  std::optional<Error> setAuthorizationAnsweredByNobody(const ClientAuthorization& refusal,
                                                        const std::shared_ptr<const Client>& forClient,
                                                        const AccountType& onAccountType);

  /// Removes the client's refusals that no user gave, or everybody's. Other records stay as they are.
  std::optional<Error> removeAnswersByNobodyForClient(const Client& client);
  std::optional<Error> removeAllAnswersByNobody();

  std::optional<Error> removeAuthorization(const AccountType& accountType, const std::string& clientID);
  ///@}

  /// \name Intents
  ///@{
  /// Notes what is about to be done with a client's access, in place of what was noted for that client before. It is forgotten
  /// with the next record that is written for the client, or removed.
  std::optional<Error> noteIntent(const Intent& intent);

  /// Notes the removal of every client that has a record.
  std::optional<Error> noteRemovalOfAllClients(const AccountType& accountType);

  std::optional<Error> forgetIntent(const AccountType& accountType, std::string_view clientID);
  std::vector<Intent> intents();
  ///@}

  /// \name History
  ///@{
  /// All of them, in this order, or none.
  std::optional<Error> appendToHistory(std::span<const HistoryEntry> entries);

  /// Newest first: in the order of appending, whatever the clock said.
  std::vector<HistoryEntry> history(const HistoryFilter& filter);
  ///@}

 private:
  struct Store;

  std::optional<std::shared_ptr<const ClientAuthorization>> _read(const std::shared_ptr<const Client>& client,
                                                                  const std::string& clientID, const AccountType& accountType);
  template <typename Work>
  std::optional<Error> _change(const StoreChange& change, Work work);
  template <typename Work>
  std::optional<Error> _writeUntold(Work work);
  std::optional<Error> _store(const ClientAuthorization& authorization, const std::shared_ptr<const Client>& client,
                              const AccountType& accountType, bool answeredByNobody);
  template <typename Query>
  std::vector<StoredAuthorization> _listed(std::string_view accountTypeIdentifier, const Query& query);
  std::shared_ptr<const Client> _clientOf(const AuthorizationRow& row) const;
  void _tell(const StoreChange& change) const;

  const ClientDirectory& _clients;
  const std::function<void(const StoreChange&)> _onChange;
  const std::unique_ptr<Store> _connections;
};

}  // namespace palisade
