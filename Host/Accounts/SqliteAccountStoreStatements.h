#pragma once

/// The account store's queries, each prepared once for its connection. Only the files of `SqliteAccountStore` include this.

#include <functional>
#include <memory>
#include <utility>

#include "Host/Accounts/ReadCache.h"
#include "Host/Accounts/SqliteAccountStore.h"
#include "Host/Sqlite/Connections.h"
#include "Host/Sqlite/Statement.h"

namespace palisade {

struct AccountStoreWriter {
  explicit AccountStoreWriter(Database& database)
      : addAccount(database, "add an account",
                   "INSERT INTO accounts (account_type, username, description) VALUES (?1, ?2, ?3) RETURNING id"),
        removeAccount(database, "remove an account", "DELETE FROM accounts WHERE id = ?1 RETURNING account_type"),
        setAuthorization(
            database, "store an authorization",
            "INSERT INTO authorizations (account_type, client_id, bundle_id, app_name, granted, answered_by_nobody,"
            " options, permissions, updated_at, digest) VALUES (?1, ?2, ?3, ?4, ?5, ?6, ?7, ?8, ?9, ?10)"
            " ON CONFLICT (account_type, client_id) DO UPDATE SET bundle_id = excluded.bundle_id,"
            " app_name = excluded.app_name, granted = excluded.granted,"
            " answered_by_nobody = excluded.answered_by_nobody, options = excluded.options,"
            " permissions = excluded.permissions, updated_at = excluded.updated_at, digest = excluded.digest"),
        removeAuthorizations(database, "remove the authorizations", "DELETE FROM authorizations WHERE account_type = ?1"),
        removeAuthorization(database, "remove an authorization",
                            "DELETE FROM authorizations WHERE account_type = ?1 AND client_id = ?2"),
        noteIntent(database, "note what is about to be done",
                   "INSERT OR REPLACE INTO intents (account_type, client_id, kind, app_id) VALUES (?1, ?2, ?3, ?4)"),
        noteRemovals(database, "note what is about to be done",
                     "INSERT OR REPLACE INTO intents (account_type, client_id, kind)"
                     " SELECT account_type, client_id, ?2 FROM authorizations WHERE account_type = ?1"),
        forgetIntent(database, "note that it is done", "DELETE FROM intents WHERE account_type = ?1 AND client_id = ?2"),
        forgetIntents(database, "note that it is done", "DELETE FROM intents WHERE account_type = ?1"),
        removeAnswersByNobodyForClient(database, "remove a refusal that nobody gave",
                                       "DELETE FROM authorizations WHERE answered_by_nobody = 1 AND client_id = ?1"),
        removeAllAnswersByNobody(database, "remove the refusals that nobody gave",
                                 "DELETE FROM authorizations WHERE answered_by_nobody = 1"),
        repeatInHistory(database, "write the history",
                        "UPDATE history SET position = (SELECT max(position) FROM history) + 1, last_at = ?5,"
                        " count = count + 1, elapsed_seconds = ?6"
                        " WHERE position = (SELECT max(position) FROM history WHERE bundle_id IS ?2 AND account_type = ?1)"
                        " AND granted = ?3 AND user_prompted = ?4"),
        appendToHistory(
            database, "write the history",
            "INSERT INTO history (account_type, bundle_id, granted, user_prompted, first_at, last_at, elapsed_seconds,"
            " count) VALUES (?1, ?2, ?3, ?4, ?5, ?5, ?6, 1)"),
        // The newest row stays; of the others those go first that nobody decided, the oldest first.
        trimHistoryOfClient(database, "shorten the history",
                            "DELETE FROM history WHERE position IN (SELECT position FROM history WHERE bundle_id IS ?1"
                            " AND position < (SELECT max(position) FROM history) ORDER BY user_prompted, position"
                            " LIMIT max(0, (SELECT count(*) FROM history WHERE bundle_id IS ?1) - ?2))"),
        trimHistory(database, "shorten the history",
                    "DELETE FROM history WHERE position IN (SELECT position FROM history"
                    " WHERE position < (SELECT max(position) FROM history) ORDER BY user_prompted, position"
                    " LIMIT max(0, (SELECT count(*) FROM history) - ?1))") {}

  Statement addAccount;
  Statement removeAccount;
  Statement setAuthorization;
  Statement removeAuthorizations;
  Statement removeAuthorization;
  Statement noteIntent;
  Statement noteRemovals;
  Statement forgetIntent;
  Statement forgetIntents;
  Statement removeAnswersByNobodyForClient;
  Statement removeAllAnswersByNobody;
  Statement repeatInHistory;
  Statement appendToHistory;
  Statement trimHistoryOfClient;
  Statement trimHistory;
};

struct AccountStoreReader {
  explicit AccountStoreReader(Database& database)
      : accounts(database, "list the accounts",
                 "SELECT id, account_type, username, description FROM accounts ORDER BY position"),
        accountsOfType(database, "list the accounts",
                       "SELECT id, username, description FROM accounts WHERE account_type = ?1 ORDER BY position"),
        authorization(database, "read an authorization",
                      "SELECT client_id, bundle_id, app_name, granted, answered_by_nobody, options, permissions, updated_at,"
                      " digest FROM authorizations WHERE account_type = ?1 AND client_id = ?2"),
        authorizationsOfBundle(
            database, "read an application's authorizations",
            "SELECT client_id, bundle_id, app_name, granted, answered_by_nobody, options, permissions, updated_at,"
            " digest FROM authorizations WHERE account_type = ?1 AND bundle_id = ?2 ORDER BY position"),
        // Nearly all records are of one account type: reading the table in its own order beats the index and a sort.
        authorizations(database, "list the authorizations",
                       "SELECT client_id, bundle_id, app_name, granted, answered_by_nobody, options, permissions, updated_at,"
                       " digest FROM authorizations NOT INDEXED WHERE account_type = ?1 ORDER BY position"),
        intents(database, "list what was about to be done", "SELECT account_type, client_id, kind, app_id FROM intents"),
        history(database, "read the history",
                "SELECT first_at, last_at, count, account_type, bundle_id, granted, user_prompted, elapsed_seconds FROM history"
                " ORDER BY position DESC LIMIT ?1"),
        historyOfClient(
            database, "read the history",
            "SELECT first_at, last_at, count, account_type, bundle_id, granted, user_prompted, elapsed_seconds FROM history"
            " WHERE bundle_id = ?2 ORDER BY position DESC LIMIT ?1") {}

  Statement accounts;
  Statement accountsOfType;
  Statement authorization;
  Statement authorizationsOfBundle;
  Statement authorizations;
  Statement intents;
  Statement history;
  Statement historyOfClient;
};

struct SqliteAccountStore::Store : private Connections<AccountStoreWriter, AccountStoreReader> {
  Store(std::unique_ptr<Database> database, std::function<void()> announceDisk)
      : Connections(std::move(database)),
        beforeDisk(std::move(announceDisk)) {}

  using Connections::database;

  template <typename Work>
  auto write(Work work) {
    beforeDisk();
    return Connections::write(std::move(work));
  }

  template <typename Work>
  auto read(Work work) {
    beforeDisk();
    return Connections::read(std::move(work));
  }

  // A write that fails may have been stored all the same.
  template <typename Cache, typename Work>
  auto writeBehind(Cache& kept, Work work) {
    struct ForgetAtEnd {
      Cache& kept;
      ~ForgetAtEnd() { kept.forget(); }
    } const forgetAtEnd{kept};
    return write(work);
  }

  const std::function<void()> beforeDisk;
  ReadCache<std::vector<AccountRecord>> accountsOfType;
  ReadCache<std::shared_ptr<const ClientAuthorization>> authorizations;  // by keyOf(type, client); their clients do not count
};

inline std::string keyOf(std::string_view accountTypeIdentifier, std::string_view clientID) {
  return std::to_string(accountTypeIdentifier.size()).append(":").append(accountTypeIdentifier).append(clientID);
}

/// Runs `work(database, writer)` and tells the listener when it has been stored; answers what kept it from being stored.
template <typename Work>
std::optional<Error> SqliteAccountStore::_change(const StoreChange& change, Work work) {
  try {
    _connections->writeBehind(_connections->authorizations, work);
  } catch (const SqliteError& error) {
    return error.error();
  }
  _tell(change);
  return std::nullopt;
}

}  // namespace palisade
