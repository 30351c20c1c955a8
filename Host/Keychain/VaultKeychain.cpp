#include "Host/Keychain/VaultKeychain.h"

#include "Host/Keychain/KeychainEntry.h"
#include "Host/Keychain/KeychainError.h"
#include "Host/Keychain/VaultKeys.h"
#include "Host/Keychain/VaultStore.h"

namespace palisade {

struct VaultKeychain::Vault {
  explicit Vault(const VaultOptions& itsOptions)
      : options(itsOptions),
        store(options.path, options.onDamage),
        keys(options, store) {}

  const VaultOptions options;
  VaultStore store;
  VaultKeys keys;
};

VaultKeychain::VaultKeychain(const VaultOptions& options) : _vault(std::make_unique<Vault>(options)) {}

VaultKeychain::~VaultKeychain() = default;

std::shared_ptr<const AccountCredential> VaultKeychain::credentialForAccount(const std::shared_ptr<Account>& account,
                                                                             const std::optional<std::string>& clientID) {
  const KeychainEntry entry = keychainEntry(account, clientID);
  const std::optional<SealedCredential> credential = _vault->store.find(entry);
  if (!credential) return nullptr;
  const std::optional<std::string> text = _vault->keys.cipher(credential->keyNumber)->open(credential->sealed, placeOf(entry));
  if (!text) {
    throw KeychainError(KeychainErrorTampered, "cannot read " + describe(entry) +
                                                   ": the vault's entry was damaged or tampered with; remove it and grant "
                                                   "access again");
  }
  return credentialInSecretText(*text, entry);
}

std::optional<Error> VaultKeychain::setCredentialForAccount(const std::shared_ptr<Account>& account,
                                                            const std::optional<std::string>& clientID) {
  return keychainAnswer([&] {
    const KeychainEntry entry = keychainEntry(account, clientID);
    const std::string text = secretTextOfCredential(account, entry);
    const VaultKeys::Current key = _vault->keys.current();
    _vault->store.set(entry, {.keyNumber = key.number, .sealed = key.cipher->seal(text, placeOf(entry))});
  });
}

std::optional<Error> VaultKeychain::removeCredentialForAccount(const std::shared_ptr<Account>& account,
                                                               const std::optional<std::string>& clientID) {
  return keychainAnswer([&] { _vault->store.remove(keychainEntry(account, clientID)); });
}

std::vector<std::string> VaultKeychain::clientIDsWithCredentials(const std::shared_ptr<Account>& account) {
  return _vault->store.clientIDs(keychainEntry(account, std::nullopt).accountID);
}

std::string VaultKeychain::description() {
  const std::string vault = "encrypted vault " + _vault->store.path().string();
  std::optional<VaultKey> key;
  // What is wrong with the store is said elsewhere.
  if (keychainAnswer([&] { key = _vault->store.newestKey(); })) return vault;
  if (!key) return vault + ", empty";
  if (key->hasHalfInService) {
    return vault +
           ", half of its key in the session's Secret Service; a program that may use the service and read your files "
           "can open it";
  }
  return vault + ", its key in a file alone; a program that may read your files can open it";
}

std::optional<std::string> VaultKeychain::trouble() {
  const auto error = keychainAnswer([&] { _vault->keys.tryAll(); });
  return error ? error->description : std::nullopt;
}

std::vector<std::string> VaultKeychain::tidy() {
  std::vector<std::string> sentences;
  const auto attempt = [&](auto work) {
    if (const auto error = keychainAnswer(work)) sentences.push_back(error->description.value_or(""));
  };
  attempt([&] {
    if (_vault->keys.areAsChosen()) return;
    _vault->keys.current();
    sentences.emplace_back("The vault has a new key, made of what the setting keychain asks for.");
  });
  if (_vault->options.choice == KeychainChoice::vault) return sentences;
  attempt([&] {
    if (!_vault->keys.service().isPresent()) return;
    const std::size_t count = _vault->keys.service().removeCredentials();
    if (count == 0) return;
    sentences.push_back(
        "Credentials that an earlier version kept in the session's Secret Service, where every application may "
        "read them, have been removed (" +
        std::to_string(count) + "). Sign in again with `palisade account add`.");
  });
  return sentences;
}

}  // namespace palisade
