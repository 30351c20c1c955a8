#include "Host/Accounts/SqliteAccountStore.h"

// The history of the clients' requests. It grows by one entry a request and, once it is full, loses as many of its oldest ones
// as come in.

#include "Host/Accounts/SqliteAccountStoreStatements.h"
#include "Host/Sqlite/Transaction.h"

namespace palisade {

std::optional<Error> SqliteAccountStore::appendToHistory(std::span<const HistoryEntry> entries) {
  try {
    _connections->write([&](Database& database, const AccountStoreWriter& writer) {
      Transaction transaction(database);
      for (const HistoryEntry& entry : entries) {
        writer.appendToHistory.execute(entry.at.time_since_epoch().count(), entry.accountTypeIdentifier, entry.bundleID,
                                       entry.granted, entry.userPrompted, entry.elapsedSeconds);
      }
      writer.trimHistory.execute(historyCapacity);
      transaction.commit();
    });
  } catch (const SqliteError& error) {
    return error.error();
  }
  return std::nullopt;
}

std::vector<HistoryEntry> SqliteAccountStore::history(const HistoryFilter& filter) {
  return _connections->read([&](const AccountStoreReader& reader) {
    Statement::Run row =
        filter.bundleID ? reader.historyOfClient.run(filter.limit, *filter.bundleID) : reader.history.run(filter.limit);
    std::vector<HistoryEntry> entries;
    while (row.next()) {
      entries.push_back({.at = Date(std::chrono::seconds(row.integer(0))),
                         .accountTypeIdentifier = row.text(1),
                         .bundleID = row.optionalText(2),
                         .granted = row.boolean(3),
                         .userPrompted = row.boolean(4),
                         .elapsedSeconds = row.real(5)});
    }
    return entries;
  });
}

}  // namespace palisade
