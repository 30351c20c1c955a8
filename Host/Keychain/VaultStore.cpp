#include "Host/Keychain/VaultStore.h"

#include <array>
#include <string_view>

#include "Host/Keychain/KeychainError.h"
#include "Host/Sqlite/Connections.h"
#include "Host/Sqlite/Statement.h"
#include "Host/Sqlite/Transaction.h"

namespace palisade {
namespace {

// "PlVb" in ASCII.
constexpr std::int32_t vaultApplicationID = 0x506c5662;

constexpr std::array<std::string_view, 1> vaultMigrations{R"sql(
  CREATE TABLE keys (
    number INTEGER PRIMARY KEY,
    id TEXT NOT NULL UNIQUE,
    has_half_in_service INTEGER NOT NULL CHECK (has_half_in_service IN (0, 1)),
    nonce BLOB NOT NULL,
    ciphertext BLOB NOT NULL
  ) STRICT;

  CREATE TABLE credentials (
    account_id TEXT NOT NULL,
    has_client INTEGER NOT NULL CHECK (has_client IN (0, 1)),
    client_id TEXT NOT NULL,
    key_number INTEGER NOT NULL REFERENCES keys (number),
    nonce BLOB NOT NULL,
    ciphertext BLOB NOT NULL,
    PRIMARY KEY (account_id, has_client, client_id)
  ) STRICT, WITHOUT ROWID;
)sql"};

#define NEWEST_KEY                                                                                  \
  "SELECT number, id, has_half_in_service, nonce, ciphertext FROM keys ORDER BY number DESC LIMIT " \
  "1"

struct Writer {
  explicit Writer(Database& database)
      : newestKey(database, "look for the vault's key", NEWEST_KEY),
        addKey(database, "remember the vault's key",
               "INSERT INTO keys (number, id, has_half_in_service, nonce, ciphertext) VALUES (?1, ?2, ?3, ?4, ?5)"),
        all(database, "read the credentials",
            "SELECT account_id, has_client, client_id, key_number, nonce, ciphertext FROM credentials"),
        set(database, "store a credential",
            "INSERT INTO credentials (account_id, has_client, client_id, key_number, nonce, ciphertext)"
            " VALUES (?1, ?2, ?3, ?4, ?5, ?6) ON CONFLICT (account_id, has_client, client_id) DO UPDATE SET"
            " key_number = excluded.key_number, nonce = excluded.nonce, ciphertext = excluded.ciphertext"),
        remove(database, "remove a credential",
               "DELETE FROM credentials WHERE account_id = ?1 AND has_client = ?2 AND client_id = ?3") {}

  Statement newestKey;
  Statement addKey;
  Statement all;
  Statement set;
  Statement remove;
};

struct Reader {
  explicit Reader(Database& database)
      : newestKey(database, "look for the vault's key", NEWEST_KEY),
        key(database, "look for the vault's key",
            "SELECT number, id, has_half_in_service, nonce, ciphertext FROM keys WHERE number = ?1"),
        keysInUse(database, "look for the vault's keys",
                  "SELECT key_number FROM credentials UNION SELECT max(number) FROM keys HAVING count(*) > 0 ORDER BY 1"),
        find(database, "read a credential",
             "SELECT key_number, nonce, ciphertext FROM credentials"
             " WHERE account_id = ?1 AND has_client = ?2 AND client_id = ?3"),
        clientIDs(database, "list the credentials",
                  "SELECT client_id FROM credentials WHERE account_id = ?1 AND has_client = 1 ORDER BY client_id") {}

  Statement newestKey;
  Statement key;
  Statement keysInUse;
  Statement find;
  Statement clientIDs;
};

std::optional<VaultKey> keyIn(Statement::Run row) {
  if (!row.next()) return std::nullopt;
  return VaultKey{.number = row.integer(0),
                  .id = row.text(1),
                  .hasHalfInService = row.boolean(2),
                  .check = {.nonce = row.blob(3), .ciphertext = row.blob(4)}};
}

void write(const Writer& writer, const KeychainEntry& entry, const SealedCredential& credential) {
  writer.set.execute(entry.accountID, entry.clientID.has_value(), entry.clientID.value_or(""), credential.keyNumber,
                     BlobView{credential.sealed.nonce}, BlobView{credential.sealed.ciphertext});
}

// Runs work on the file; what the store throws leaves as a keychain error.
template <typename Work>
auto translated(Work work) {
  try {
    return work();
  } catch (const SqliteError& error) {
    const bool isDamaged = error.code() == StoreErrorDamaged || error.code() == StoreErrorSetAside;
    throw KeychainError(isDamaged ? KeychainErrorTampered : KeychainErrorStorage, error.what());
  }
}

}  // namespace

#undef NEWEST_KEY

struct VaultStore::Rows : Connections<Writer, Reader> {
  using Connections::Connections;
};

VaultStore::VaultStore(const std::filesystem::path& path, DamagedStore onDamage)
    : _rows(translated([&] {
        return std::make_unique<Rows>(Database::open(
            {.path = path, .applicationID = vaultApplicationID, .migrations = vaultMigrations, .onDamage = onDamage}));
      })) {}

VaultStore::~VaultStore() = default;

const std::filesystem::path& VaultStore::path() const { return _rows->database().path(); }

std::optional<VaultKey> VaultStore::newestKey() {
  return translated([&] { return _rows->read([](const Reader& reader) { return keyIn(reader.newestKey.run()); }); });
}

std::optional<VaultKey> VaultStore::key(std::int64_t number) {
  return translated([&] { return _rows->read([&](const Reader& reader) { return keyIn(reader.key.run(number)); }); });
}

std::vector<std::int64_t> VaultStore::keysInUse() {
  return translated([&] {
    return _rows->read([](const Reader& reader) {
      std::vector<std::int64_t> numbers;
      Statement::Run row = reader.keysInUse.run();
      while (row.next()) numbers.push_back(row.integer(0));
      return numbers;
    });
  });
}

bool VaultStore::addKey(const VaultKey& key, const SealAnew& sealAnew) {
  return translated([&] {
    return _rows->write([&](Database& database, const Writer& writer) {
      Transaction transaction(database);
      const std::optional<VaultKey> newest = keyIn(writer.newestKey.run());
      if ((newest ? newest->number : 0) + 1 != key.number) return false;
      writer.addKey.execute(key.number, key.id, key.hasHalfInService, BlobView{key.check.nonce},
                            BlobView{key.check.ciphertext});
      std::vector<std::pair<KeychainEntry, SealedCredential>> changed;
      for (Statement::Run row = writer.all.run(); row.next();) {
        KeychainEntry entry{
            .accountID = row.text(0), .clientID = row.boolean(1) ? std::optional(row.text(2)) : std::nullopt, .username = {}};
        const SealedCredential credential{.keyNumber = row.integer(3),
                                          .sealed = {.nonce = row.blob(4), .ciphertext = row.blob(5)}};
        if (auto sealed = sealAnew(credential, placeOf(entry))) {
          changed.emplace_back(std::move(entry), SealedCredential{.keyNumber = key.number, .sealed = std::move(*sealed)});
        }
      }
      for (const auto& [entry, credential] : changed) write(writer, entry, credential);
      transaction.commit();
      return true;
    });
  });
}

std::optional<SealedCredential> VaultStore::find(const KeychainEntry& entry) {
  return translated([&] {
    return _rows->read([&](const Reader& reader) -> std::optional<SealedCredential> {
      Statement::Run row = reader.find.run(entry.accountID, entry.clientID.has_value(), entry.clientID.value_or(""));
      if (!row.next()) return std::nullopt;
      return SealedCredential{.keyNumber = row.integer(0), .sealed = {.nonce = row.blob(1), .ciphertext = row.blob(2)}};
    });
  });
}

void VaultStore::set(const KeychainEntry& entry, const SealedCredential& credential) {
  translated([&] { _rows->write([&](Database&, const Writer& writer) { write(writer, entry, credential); }); });
}

void VaultStore::remove(const KeychainEntry& entry) {
  translated([&] {
    _rows->write([&](Database&, const Writer& writer) {
      writer.remove.execute(entry.accountID, entry.clientID.has_value(), entry.clientID.value_or(""));
    });
  });
}

std::vector<std::string> VaultStore::clientIDs(const std::string& accountID) {
  return translated([&] {
    return _rows->read([&](const Reader& reader) {
      std::vector<std::string> clientIDs;
      Statement::Run row = reader.clientIDs.run(accountID);
      while (row.next()) clientIDs.push_back(row.text(0));
      return clientIDs;
    });
  });
}

std::string placeOf(const KeychainEntry& entry) {
  const auto withLength = [](std::string_view text) { return std::to_string(text.size()) + ':' + std::string(text); };
  return withLength(keychainServiceName) + withLength(entry.accountID) +
         (entry.clientID ? "client" + withLength(*entry.clientID) : "account");
}

}  // namespace palisade
