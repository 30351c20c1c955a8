#include "Host/Keychain/VaultKeychain.h"

#include <array>
#include <string_view>

#include "Host/Keychain/KeychainEntry.h"
#include "Host/Keychain/KeychainError.h"
#include "Host/Keychain/VaultCipher.h"
#include "Host/Sqlite/Connections.h"
#include "Host/Sqlite/Statement.h"
#include "Host/Sqlite/Transaction.h"

namespace palisade {
namespace {

// "PlVa" in ASCII.
constexpr std::int32_t vaultApplicationID = 0x506c5661;

// `key_check` holds one sealed text that everybody knows: it tells another key from a damaged entry.
constexpr std::array<std::string_view, 1> vaultMigrations{R"sql(
  CREATE TABLE key_check (
    one INTEGER PRIMARY KEY CHECK (one = 1),
    nonce BLOB NOT NULL,
    ciphertext BLOB NOT NULL
  ) STRICT;

  CREATE TABLE credentials (
    account_id TEXT NOT NULL,
    has_client INTEGER NOT NULL CHECK (has_client IN (0, 1)),
    client_id TEXT NOT NULL,
    nonce BLOB NOT NULL,
    ciphertext BLOB NOT NULL,
    PRIMARY KEY (account_id, has_client, client_id)
  ) STRICT, WITHOUT ROWID;
)sql"};

constexpr std::string_view knownText = "This key opens this vault.";

struct Writer {
  explicit Writer(Database& database)
      : keyCheck(database, "look at the vault's key", "SELECT nonce, ciphertext FROM key_check WHERE one = 1"),
        setKeyCheck(database, "remember the vault's key", "INSERT INTO key_check (one, nonce, ciphertext) VALUES (1, ?1, ?2)"),
        set(database, "store a credential",
            "INSERT INTO credentials (account_id, has_client, client_id, nonce, ciphertext) VALUES (?1, ?2, ?3, ?4, ?5)"
            " ON CONFLICT (account_id, has_client, client_id) DO UPDATE SET nonce = excluded.nonce,"
            " ciphertext = excluded.ciphertext"),
        remove(database, "remove a credential",
               "DELETE FROM credentials WHERE account_id = ?1 AND has_client = ?2 AND client_id = ?3") {}

  Statement keyCheck;
  Statement setKeyCheck;
  Statement set;
  Statement remove;
};

struct Reader {
  explicit Reader(Database& database)
      : find(database, "read a credential",
             "SELECT nonce, ciphertext FROM credentials WHERE account_id = ?1 AND has_client = ?2 AND client_id = ?3"),
        clientIDs(database, "list the credentials",
                  "SELECT client_id FROM credentials WHERE account_id = ?1 AND has_client = 1 ORDER BY client_id") {}

  Statement find;
  Statement clientIDs;
};

// Unlike texts give unlike places: every text comes behind its length.
std::string placeOf(const KeychainEntry& entry) {
  const auto withLength = [](std::string_view text) { return std::to_string(text.size()) + ':' + std::string(text); };
  return withLength(keychainServiceName) + withLength(entry.accountID) +
         (entry.clientID ? "client" + withLength(*entry.clientID) : "account");
}

KeychainError storageError(const SqliteError& error) {
  return {
      error.code() == StoreErrorDamaged || error.code() == StoreErrorSetAside ? KeychainErrorTampered : KeychainErrorStorage,
      error.what()};
}

// Runs work on the vault; what the store throws leaves as a keychain error.
template <typename Work>
auto translated(Work work) {
  try {
    return work();
  } catch (const SqliteError& error) {
    throw storageError(error);
  }
}

template <typename Work>
std::optional<Error> translatedAnswer(Work work) {
  return keychainAnswer([&] { translated(work); });
}

bool isThere(const std::filesystem::path& path) {
  std::error_code error;
  return std::filesystem::exists(path, error);
}

// The key comes from the service manager or is our own. One of our own is made only for a vault that has never had a key.
VaultCipher cipherFor(const VaultOptions& options, bool hadKey) {
  if (options.credentialsFolder) {
    const std::filesystem::path credential = *options.credentialsFolder / "keychain.key";
    if (isThere(credential)) return {credential, VaultCipher::KeyFile::systemCredential};
  }
  if (!isThere(options.keyFile)) {
    if (hadKey) {
      throw KeychainError(KeychainErrorKey, "cannot open the vault " + options.path.string() + ": its key file " +
                                                options.keyFile.string() +
                                                " is missing; put it back, or move the vault away and add the accounts again");
    }
    VaultCipher::createKeyFile(options.keyFile);
  }
  return {options.keyFile, VaultCipher::KeyFile::ownKey};
}

// What the key check holds; none in a vault that has never had a key.
std::optional<VaultCipher::Sealed> readKeyCheck(const Writer& writer) {
  Statement::Run row = writer.keyCheck.run();
  if (!row.next()) return std::nullopt;
  return VaultCipher::Sealed{.nonce = row.blob(0), .ciphertext = row.blob(1)};
}

}  // namespace

struct VaultKeychain::Vault {
  explicit Vault(const VaultOptions& options)
      : store(Database::open({.path = options.path,
                              .applicationID = vaultApplicationID,
                              .migrations = vaultMigrations,
                              .onDamage = options.onDamage})),
        cipher(store.write([&](Database& database, const Writer& writer) { return openWithKey(options, database, writer); })) {}

  // Under the write lock: of two processes that open a new vault, one gives it its key.
  static VaultCipher openWithKey(const VaultOptions& options, Database& database, const Writer& writer) {
    Transaction transaction(database);
    const std::optional<VaultCipher::Sealed> keyCheck = readKeyCheck(writer);
    VaultCipher cipher = cipherFor(options, keyCheck.has_value());
    if (keyCheck && cipher.open(*keyCheck, keychainServiceName) != knownText) {
      throw KeychainError(KeychainErrorKey, "cannot open the vault " + options.path.string() +
                                                ": its key is another one; put the key back that it was made with");
    }
    if (!keyCheck) {
      const VaultCipher::Sealed sealed = cipher.seal(knownText, keychainServiceName);
      writer.setKeyCheck.execute(BlobView{sealed.nonce}, BlobView{sealed.ciphertext});
      transaction.commit();
    }
    return cipher;
  }

  Connections<Writer, Reader> store;
  const VaultCipher cipher;
};

VaultKeychain::VaultKeychain(const VaultOptions& options)
    : _vault(translated([&] { return std::make_unique<Vault>(options); })) {}

VaultKeychain::~VaultKeychain() = default;

std::shared_ptr<const AccountCredential> VaultKeychain::credentialForAccount(const std::shared_ptr<Account>& account,
                                                                             const std::optional<std::string>& clientID) {
  const KeychainEntry entry = keychainEntry(account, clientID);
  const auto sealed = translated([&] {
    return _vault->store.read([&](const Reader& reader) -> std::optional<VaultCipher::Sealed> {
      Statement::Run row = reader.find.run(entry.accountID, entry.clientID.has_value(), entry.clientID.value_or(""));
      if (!row.next()) return std::nullopt;
      return VaultCipher::Sealed{.nonce = row.blob(0), .ciphertext = row.blob(1)};
    });
  });
  if (!sealed) return nullptr;

  const std::optional<std::string> text = _vault->cipher.open(*sealed, placeOf(entry));
  if (!text) {
    throw KeychainError(KeychainErrorTampered, "cannot read " + describe(entry) +
                                                   ": the vault's entry was damaged or tampered with; remove it and grant "
                                                   "access again");
  }
  return credentialInSecretText(*text, entry);
}

std::optional<Error> VaultKeychain::setCredentialForAccount(const std::shared_ptr<Account>& account,
                                                            const std::optional<std::string>& clientID) {
  return translatedAnswer([&] {
    const KeychainEntry entry = keychainEntry(account, clientID);
    const VaultCipher::Sealed sealed = _vault->cipher.seal(secretTextOfCredential(account, entry), placeOf(entry));
    _vault->store.write([&](Database&, const Writer& writer) {
      writer.set.execute(entry.accountID, entry.clientID.has_value(), entry.clientID.value_or(""), BlobView{sealed.nonce},
                         BlobView{sealed.ciphertext});
    });
  });
}

std::optional<Error> VaultKeychain::removeCredentialForAccount(const std::shared_ptr<Account>& account,
                                                               const std::optional<std::string>& clientID) {
  return translatedAnswer([&] {
    const KeychainEntry entry = keychainEntry(account, clientID);
    _vault->store.write([&](Database&, const Writer& writer) {
      writer.remove.execute(entry.accountID, entry.clientID.has_value(), entry.clientID.value_or(""));
    });
  });
}

std::vector<std::string> VaultKeychain::clientIDsWithCredentials(const std::shared_ptr<Account>& account) {
  const KeychainEntry entry = keychainEntry(account, std::nullopt);
  return translated([&] {
    return _vault->store.read([&](const Reader& reader) {
      std::vector<std::string> clientIDs;
      Statement::Run row = reader.clientIDs.run(entry.accountID);
      while (row.next()) clientIDs.push_back(row.text(0));
      return clientIDs;
    });
  });
}

std::string VaultKeychain::description() const { return "encrypted vault " + _vault->store.database().path().string(); }

}  // namespace palisade
