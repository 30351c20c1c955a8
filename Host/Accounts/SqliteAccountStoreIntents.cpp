#include "Host/Accounts/SqliteAccountStore.h"

// What is about to be done with a client's access. An intent is forgotten with the record that fulfils it, in one transaction;
// so one that is found when nothing is being done was cut off.

#include <algorithm>
#include <array>
#include <utility>

#include "Host/Accounts/SqliteAccountStoreStatements.h"
#include "Platform/AccountType.h"

namespace palisade {
namespace {

constexpr std::array<std::pair<Intent::Kind, std::string_view>, 3> kindNames{
    {{Intent::Kind::grant, "grant"}, {Intent::Kind::revocation, "revocation"}, {Intent::Kind::removal, "removal"}}};

std::string_view nameOf(Intent::Kind kind) {
  return std::ranges::find(kindNames, kind, &decltype(kindNames)::value_type::first)->second;
}

// The table's own check leaves no other name.
Intent::Kind kindNamed(std::string_view name) {
  return std::ranges::find(kindNames, name, &decltype(kindNames)::value_type::second)->first;
}

}  // namespace

template <typename Work>
std::optional<Error> SqliteAccountStore::_writeUntold(Work work) {
  try {
    _connections->write(work);
  } catch (const SqliteError& error) {
    return error.error();
  }
  return std::nullopt;
}

std::optional<Error> SqliteAccountStore::noteIntent(const Intent& intent) {
  return _writeUntold([&](Database&, const AccountStoreWriter& writer) {
    writer.noteIntent.execute(intent.accountTypeIdentifier, intent.clientID, nameOf(intent.kind), intent.appID);
  });
}

std::optional<Error> SqliteAccountStore::noteRemovalOfAllClients(const AccountType& accountType) {
  return _writeUntold([&](Database&, const AccountStoreWriter& writer) {
    writer.noteRemovals.execute(accountType.identifier(), nameOf(Intent::Kind::removal));
  });
}

std::optional<Error> SqliteAccountStore::forgetIntent(const AccountType& accountType, std::string_view clientID) {
  return _writeUntold(
      [&](Database&, const AccountStoreWriter& writer) { writer.forgetIntent.execute(accountType.identifier(), clientID); });
}

std::vector<Intent> SqliteAccountStore::intents() {
  return _connections->read([](const AccountStoreReader& reader) {
    std::vector<Intent> intents;
    Statement::Run row = reader.intents.run();
    while (row.next()) {
      intents.push_back({.kind = kindNamed(row.text(2)),
                         .accountTypeIdentifier = row.text(0),
                         .clientID = row.text(1),
                         .appID = row.optionalText(3)});
    }
    return intents;
  });
}

}  // namespace palisade
