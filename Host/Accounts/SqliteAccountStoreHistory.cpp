#include "Host/Accounts/SqliteAccountStore.h"

// The history of the clients' requests. What a client's last row says already is counted there, so a flood of equal answers
// takes one row. A client has a share of the rows and all together have a number: nobody drives out what others did, and least
// of all what a person decided.

#include "Host/Accounts/SqliteAccountStoreStatements.h"
#include "Host/Sqlite/Transaction.h"

namespace palisade {

std::optional<Error> SqliteAccountStore::appendToHistory(std::span<const HistoryEntry> entries) {
  try {
    _connections->write([&](Database& database, const AccountStoreWriter& writer) {
      Transaction transaction(database);
      for (const HistoryEntry& entry : entries) {
        const auto write = [&](const Statement& statement) {
          return statement.execute(entry.accountTypeIdentifier, entry.bundleID, entry.granted, entry.userPrompted,
                                   entry.last.time_since_epoch().count(), entry.elapsedSeconds);
        };
        if (write(writer.repeatInHistory) > 0) continue;
        write(writer.appendToHistory);
        writer.trimHistoryOfClient.execute(entry.bundleID, historyShareOfClient);
        writer.trimHistory.execute(historyCapacity);
      }
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
      entries.push_back({.first = Date(std::chrono::seconds(row.integer(0))),
                         .last = Date(std::chrono::seconds(row.integer(1))),
                         .count = row.integer(2),
                         .accountTypeIdentifier = row.text(3),
                         .bundleID = row.optionalText(4),
                         .granted = row.boolean(5),
                         .userPrompted = row.boolean(6),
                         .elapsedSeconds = row.real(7)});
    }
    return entries;
  });
}

}  // namespace palisade
