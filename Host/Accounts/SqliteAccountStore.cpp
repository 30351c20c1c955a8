#include "Host/Accounts/SqliteAccountStore.h"

#include "Host/Accounts/AccountStoreSchema.h"
#include "Host/Accounts/SqliteAccountStoreStatements.h"
#include "Host/Accounts/StoredAccount.h"

namespace palisade {

SqliteAccountStore::SqliteAccountStore(AccountStoreOptions options, const ClientDirectory& clients)
    : _clients(clients),
      _onChange(std::move(options.onChange)),
      _connections(std::make_unique<Store>(Database::open({.path = std::move(options.path),
                                                           .applicationID = accountStoreApplicationID,
                                                           .migrations = accountStoreMigrations,
                                                           .onDamage = options.onDamage}),
                                           std::move(options.beforeDisk))) {}

SqliteAccountStore::~SqliteAccountStore() = default;

const std::optional<std::filesystem::path>& SqliteAccountStore::damagedStore() const {
  return _connections->database().setAside();
}

std::vector<std::shared_ptr<Account>> SqliteAccountStore::accountsWithAccountTypeIdentifier(std::string_view identifier) {
  const auto records = _connections->accountsOfType.get(std::string(identifier), [&] {
    return std::optional(_connections->read([&](const AccountStoreReader& reader) {
      std::vector<AccountRecord> read;
      Statement::Run row = reader.accountsOfType.run(identifier);
      while (row.next()) {
        read.push_back({.id = row.text(0),
                        .accountTypeIdentifier = std::string(identifier),
                        .username = row.text(1),
                        .description = row.text(2)});
      }
      return read;
    }));
  });
  std::vector<std::shared_ptr<Account>> accounts;
  for (const AccountRecord& record : *records) {
    accounts.push_back(std::make_shared<StoredAccount>(record.id, record.username, record.description));
  }
  return accounts;
}

std::vector<AccountRecord> SqliteAccountStore::accounts() {
  return _connections->read([](const AccountStoreReader& reader) {
    std::vector<AccountRecord> accounts;
    Statement::Run row = reader.accounts.run();
    while (row.next()) {
      accounts.push_back(
          {.id = row.text(0), .accountTypeIdentifier = row.text(1), .username = row.text(2), .description = row.text(3)});
    }
    return accounts;
  });
}

AccountRecord SqliteAccountStore::addAccount(std::string_view accountTypeIdentifier, std::string_view username,
                                             std::string_view description) {
  AccountRecord account{.id = {},
                        .accountTypeIdentifier = std::string(accountTypeIdentifier),
                        .username = std::string(username),
                        .description = std::string(description)};
  account.id = _connections->writeBehind(_connections->accountsOfType, [&](Database&, const AccountStoreWriter& writer) {
    Statement::Run row = writer.addAccount.run(accountTypeIdentifier, username, description);
    row.next();
    std::string id = row.text(0);
    // The row is stored when the query has run to its end.
    row.next();
    return id;
  });
  _tell({.kind = StoreChange::Kind::accounts, .accountTypeIdentifier = account.accountTypeIdentifier});
  return account;
}

bool SqliteAccountStore::removeAccount(std::string_view id) {
  const auto accountTypeIdentifier = _connections->writeBehind(
      _connections->accountsOfType, [&](Database&, const AccountStoreWriter& writer) -> std::optional<std::string> {
        Statement::Run row = writer.removeAccount.run(id);
        if (!row.next()) return std::nullopt;
        std::string identifier = row.text(0);
        row.next();
        return identifier;
      });
  if (!accountTypeIdentifier) return false;
  _tell({.kind = StoreChange::Kind::accounts, .accountTypeIdentifier = *accountTypeIdentifier});
  return true;
}

void SqliteAccountStore::_tell(const StoreChange& change) const {
  if (_onChange) _onChange(change);
}

}  // namespace palisade
