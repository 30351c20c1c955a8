#include "Host/Accounts/SqliteAccountStore.h"

// The records of what clients were granted or refused. A record is read as text, and becomes an object when its digest is
// right and nothing of the store is held any more. Everything a write needs is made before the store is entered.

#include <chrono>
#include <stdexcept>
#include <utility>

#include "Host/Accounts/AuthorizationRow.h"
#include "Host/Accounts/ClientDirectory.h"
#include "Host/Accounts/RememberedClient.h"
#include "Host/Accounts/SqliteAccountStoreStatements.h"
#include "Host/Sqlite/Transaction.h"
#include "Platform/AccountType.h"

namespace palisade {
namespace {

constexpr std::string_view storing = "store an authorization";

struct ReadRow {
  AuthorizationRow row;
  bool isDamaged = false;
};

ReadRow readRow(const Statement::Run& run, std::string_view accountTypeIdentifier) {
  AuthorizationRow row{.clientID = run.text(0),
                       .bundleID = run.optionalText(1),
                       .appName = run.text(2),
                       .granted = run.boolean(3),
                       .answeredByNobody = run.boolean(4),
                       .options = run.optionalText(5),
                       .permissions = run.optionalText(6),
                       .updatedAt = run.integer(7)};
  const bool isDamaged = run.integer(8) != digestOf(accountTypeIdentifier, row);
  return {.row = std::move(row), .isDamaged = isDamaged};
}

std::int64_t secondsSinceEpoch() {
  return std::chrono::floor<std::chrono::seconds>(std::chrono::system_clock::now()).time_since_epoch().count();
}

StoreChange changeOf(const AccountType& accountType, std::optional<std::string> clientID) {
  return {.kind = StoreChange::Kind::authorizations,
          .accountTypeIdentifier = accountType.identifier(),
          .clientID = std::move(clientID)};
}

}  // namespace

std::shared_ptr<ClientAuthorization> SqliteAccountStore::authorizationForClient(const std::shared_ptr<const Client>& client,
                                                                                const AccountType& accountType) {
  if (client == nullptr) return nullptr;
  const std::string clientID = _clients.idOfClient(*client);
  const auto kept = _connections->authorizations.get(keyOf(accountType.identifier(), clientID),
                                                     [&] { return _read(client, clientID, accountType); });
  if (!kept) return nullptr;
  auto record = std::make_shared<ClientAuthorization>(client);
  record->setIsGranted((*kept)->isGranted());
  record->setOptions((*kept)->options());
  record->setGrantedPermissions((*kept)->grantedPermissions());
  return record;
}

std::optional<std::shared_ptr<const ClientAuthorization>> SqliteAccountStore::_read(const std::shared_ptr<const Client>& client,
                                                                                    const std::string& clientID,
                                                                                    const AccountType& accountType) {
  const std::optional<ReadRow> found = _connections->read([&](const AccountStoreReader& reader) -> std::optional<ReadRow> {
    Statement::Run run = reader.authorization.run(accountType.identifier(), clientID);
    if (!run.next()) return std::nullopt;
    return readRow(run, accountType.identifier());
  });
  if (!found) return std::nullopt;

  // The ID is compared too: damage to the index leads to the record of somebody else, which is whole.
  auto record = found->isDamaged || found->row.clientID != clientID ? nullptr : recordInRow(found->row, client);
  if (record == nullptr) {
    throw SqliteError(StoreErrorDamaged, _connections->database().path(), "read the authorization of " + clientID,
                      "the record is damaged; revoke the access of all clients, or restore the store from a copy");
  }
  return record;
}

// `query` begins a run of one of the reader's statements.
template <typename Query>
std::vector<StoredAuthorization> SqliteAccountStore::_listed(std::string_view accountTypeIdentifier, const Query& query) {
  std::vector<ReadRow> rows = _connections->read([&](const AccountStoreReader& reader) {
    std::vector<ReadRow> read;
    Statement::Run run = query(reader);
    while (run.next()) read.push_back(readRow(run, accountTypeIdentifier));
    return read;
  });

  std::vector<StoredAuthorization> authorizations;
  authorizations.reserve(rows.size());
  for (auto& [row, isDamaged] : rows) {
    const std::shared_ptr<const Client> client = _clientOf(row);
    auto record = isDamaged ? nullptr : recordInRow(row, client);
    const bool isReadable = record != nullptr;
    if (!isReadable) record = std::make_shared<ClientAuthorization>(client);
    authorizations.push_back({.clientID = std::move(row.clientID),
                              .accountTypeIdentifier = std::string(accountTypeIdentifier),
                              .record = std::move(record),
                              .updatedAt = Date(std::chrono::seconds(row.updatedAt)),
                              .isAnsweredByNobody = row.answeredByNobody,
                              .isDamaged = !isReadable});
  }
  return authorizations;
}

std::vector<StoredAuthorization> SqliteAccountStore::storedAuthorizations(std::string_view accountTypeIdentifier) {
  return _listed(accountTypeIdentifier,
                 [&](const AccountStoreReader& reader) { return reader.authorizations.run(accountTypeIdentifier); });
}

std::optional<StoredAuthorization> SqliteAccountStore::storedAuthorization(std::string_view accountTypeIdentifier,
                                                                           std::string_view clientID) {
  auto found = _listed(accountTypeIdentifier, [&](const AccountStoreReader& reader) {
    return reader.authorization.run(accountTypeIdentifier, clientID);
  });
  return found.empty() ? std::nullopt : std::optional(std::move(found.front()));
}

std::vector<StoredAuthorization> SqliteAccountStore::storedAuthorizationsOfBundle(std::string_view accountTypeIdentifier,
                                                                                  std::string_view bundleID) {
  return _listed(accountTypeIdentifier, [&](const AccountStoreReader& reader) {
    return reader.authorizationsOfBundle.run(accountTypeIdentifier, bundleID);
  });
}

std::vector<std::shared_ptr<ClientAuthorization>> SqliteAccountStore::allAuthorizationsForAccountType(
    const AccountType& accountType) {
  std::vector<std::shared_ptr<ClientAuthorization>> records;
  for (StoredAuthorization& stored : storedAuthorizations(accountType.identifier())) {
    records.push_back(std::move(stored.record));
  }
  return records;
}

std::optional<Error> SqliteAccountStore::setAuthorization(const ClientAuthorization& authorization,
                                                          const std::shared_ptr<const Client>& forClient,
                                                          const AccountType& onAccountType) {
  return _store(authorization, forClient, onAccountType, false);
}

std::optional<Error> SqliteAccountStore::setAuthorizationAnsweredByNobody(const ClientAuthorization& refusal,
                                                                          const std::shared_ptr<const Client>& forClient,
                                                                          const AccountType& onAccountType) {
  if (refusal.isGranted()) {
    return SqliteError(StoreErrorConstraint, _connections->database().path(), storing, "nobody cannot have granted it").error();
  }
  return _store(refusal, forClient, onAccountType, true);
}

std::optional<Error> SqliteAccountStore::_store(const ClientAuthorization& authorization,
                                                const std::shared_ptr<const Client>& client, const AccountType& accountType,
                                                bool answeredByNobody) {
  AuthorizationRow row;
  try {
    row = {.clientID = _clients.idOfClient(*client),
           .bundleID = client->bundleID(),
           .appName = client->localizedAppName(),
           .granted = authorization.isGranted(),
           .answeredByNobody = answeredByNobody,
           .options = storedOptions(authorization),
           .permissions = storedPermissions(authorization),
           .updatedAt = secondsSinceEpoch()};
  } catch (const std::invalid_argument& error) {
    return SqliteError(StoreErrorNotRepresentable, _connections->database().path(), storing, error.what()).error();
  }
  const std::int64_t digest = digestOf(accountType.identifier(), row);
  return _change(changeOf(accountType, row.clientID), [&](Database& database, const AccountStoreWriter& writer) {
    Transaction transaction(database);
    writer.setAuthorization.execute(accountType.identifier(), row.clientID, row.bundleID, row.appName, row.granted,
                                    row.answeredByNobody, row.options, row.permissions, row.updatedAt, digest);
    writer.forgetIntent.execute(accountType.identifier(), row.clientID);
    transaction.commit();
  });
}

std::optional<Error> SqliteAccountStore::removeAuthorization(const AccountType& accountType, const std::string& clientID) {
  return _change(changeOf(accountType, clientID), [&](Database& database, const AccountStoreWriter& writer) {
    Transaction transaction(database);
    writer.removeAuthorization.execute(accountType.identifier(), clientID);
    writer.forgetIntent.execute(accountType.identifier(), clientID);
    transaction.commit();
  });
}

std::optional<Error> SqliteAccountStore::removeAllClientAuthorizationsForAccountType(const AccountType& accountType) {
  return _change(changeOf(accountType, std::nullopt), [&](Database& database, const AccountStoreWriter& writer) {
    Transaction transaction(database);
    writer.removeAuthorizations.execute(accountType.identifier());
    writer.forgetIntents.execute(accountType.identifier());
    transaction.commit();
  });
}

std::optional<Error> SqliteAccountStore::removeAnswersByNobodyForClient(const Client& client) {
  const std::string clientID = _clients.idOfClient(client);
  return _change({.kind = StoreChange::Kind::authorizations, .clientID = clientID},
                 [&](Database&, const AccountStoreWriter& writer) { writer.removeAnswersByNobodyForClient.execute(clientID); });
}

std::optional<Error> SqliteAccountStore::removeAllAnswersByNobody() {
  return _change({.kind = StoreChange::Kind::authorizations},
                 [](Database&, const AccountStoreWriter& writer) { writer.removeAllAnswersByNobody.execute(); });
}

std::shared_ptr<const Client> SqliteAccountStore::_clientOf(const AuthorizationRow& row) const {
  if (auto known = _clients.clientWithID(row.clientID)) return known;
  return std::make_shared<RememberedClient>(row.clientID, row.bundleID, row.appName);
}

}  // namespace palisade
