#include "Host/Keychain/SecretServiceKeychain.h"

#include <algorithm>

#include "Host/Keychain/KeychainEntry.h"
#include "Host/Keychain/KeychainError.h"
#include "Host/Keychain/SecretServiceSession.h"
#include "Host/Secrets/Wipe.h"

namespace palisade {
namespace {

constexpr const char* serviceAttribute = "service";
constexpr const char* accountAttribute = "account";
constexpr const char* kindAttribute = "kind";
constexpr const char* clientAttribute = "client";
constexpr const char* kindAccount = "account";
constexpr const char* kindClient = "client";

const SecretSchema* schema() {
  static const GHandle<SecretSchema> made(
      secret_schema_new("com.veltran.Accounts1.Credential", SECRET_SCHEMA_NONE, serviceAttribute,
                        SECRET_SCHEMA_ATTRIBUTE_STRING, accountAttribute, SECRET_SCHEMA_ATTRIBUTE_STRING, kindAttribute,
                        SECRET_SCHEMA_ATTRIBUTE_STRING, clientAttribute, SECRET_SCHEMA_ATTRIBUTE_STRING, nullptr));
  return made.get();
}

using Attributes = GHandle<GHashTable>;

Attributes attributesOf(const std::string& accountID, const char* kind) {
  return Attributes(secret_attributes_build(schema(), serviceAttribute, std::string(keychainServiceName).c_str(),
                                            accountAttribute, accountID.c_str(), kindAttribute, kind, nullptr));
}

Attributes attributesOf(const KeychainEntry& entry) {
  Attributes attributes = attributesOf(entry.accountID, entry.clientID ? kindClient : kindAccount);
  if (entry.clientID) g_hash_table_insert(attributes.get(), g_strdup(clientAttribute), g_strdup(entry.clientID->c_str()));
  return attributes;
}

GHandle<SecretCollection> defaultCollection(SecretService* service, GCancellable* cancellable) {
  GOutcome outcome;
  GHandle<SecretCollection> collection(secret_collection_for_alias_sync(service, SECRET_COLLECTION_DEFAULT,
                                                                        SECRET_COLLECTION_NONE, cancellable, outcome.place()));
  outcome.check();
  return collection;
}

void requireUnlocked(const SecretCollection* collection, const std::string& during) {
  if (collection == nullptr) {
    throw KeychainError(KeychainErrorUnavailable,
                        "cannot " + during +
                            ": the session's Secret Service has no default keyring; make one, or choose the "
                            "vault as keychain");
  }
  if (secret_collection_get_locked(const_cast<SecretCollection*>(collection)) != FALSE) {
    throw KeychainError(KeychainErrorLocked, "cannot " + during + ": the session's keyring is locked; unlock it and try again");
  }
}

// The items with these attributes. Nothing found in a locked keyring says nothing, and is an error.
GHandle<GList> search(SecretService* service, const Attributes& attributes, int flags, GCancellable* cancellable,
                      const std::string& during) {
  GOutcome outcome;
  GHandle<GList> items(secret_service_search_sync(service, schema(), attributes.get(), static_cast<SecretSearchFlags>(flags),
                                                  cancellable, outcome.place()));
  outcome.check();
  if (items == nullptr) {
    const auto collection = defaultCollection(service, cancellable);
    if (collection != nullptr) requireUnlocked(collection.get(), during);
  }
  for (const GList* each = items.get(); each != nullptr; each = each->next) {
    if (secret_item_get_locked(static_cast<SecretItem*>(each->data)) == FALSE) continue;
    throw KeychainError(KeychainErrorLocked, "cannot " + during + ": the session's keyring is locked; unlock it and try again");
  }
  return items;
}

}  // namespace

SecretServiceKeychain::SecretServiceKeychain(std::chrono::milliseconds timeLimit)
    : _session(std::make_unique<SecretServiceSession>(timeLimit)) {}

SecretServiceKeychain::~SecretServiceKeychain() = default;

bool SecretServiceKeychain::isPresent() {
  bool hasCollection = false;
  try {
    _session->run("look for a keyring", [&](SecretService* service, GCancellable* cancellable) {
      hasCollection = defaultCollection(service, cancellable) != nullptr;
    });
  } catch (const KeychainError&) {
    return false;
  }
  return hasCollection;
}

std::shared_ptr<const AccountCredential> SecretServiceKeychain::credentialForAccount(
    const std::shared_ptr<Account>& account, const std::optional<std::string>& clientID) {
  const KeychainEntry entry = keychainEntry(account, clientID);
  const std::string during = "read " + describe(entry);
  std::shared_ptr<const AccountCredential> credential;
  _session->run(during, [&](SecretService* service, GCancellable* cancellable) {
    const auto items = search(service, attributesOf(entry), SECRET_SEARCH_LOAD_SECRETS, cancellable, during);
    if (items == nullptr) return;
    const GHandle<SecretValue> value(secret_item_get_secret(static_cast<SecretItem*>(items->data)));
    if (value == nullptr) {
      throw KeychainError(KeychainErrorUnavailable, "cannot " + during + ": the session's Secret Service does not hand it out");
    }
    gsize size = 0;
    const gchar* const text = secret_value_get(value.get(), &size);
    credential = credentialInSecretText({text, size}, entry);
  });
  return credential;
}

std::optional<Error> SecretServiceKeychain::setCredentialForAccount(const std::shared_ptr<Account>& account,
                                                                    const std::optional<std::string>& clientID) {
  return keychainAnswer([&] {
    const KeychainEntry entry = keychainEntry(account, clientID);
    const std::string during = "store " + describe(entry);
    std::string text = secretTextOfCredential(account, entry);
    // The library copies the text into memory that is never swapped.
    const GHandle<SecretValue> value(secret_value_new(text.data(), static_cast<gssize>(text.size()), "text/plain"));
    wipe(text);
    _session->run(during, [&](SecretService* service, GCancellable* cancellable) {
      const auto collection = defaultCollection(service, cancellable);
      requireUnlocked(collection.get(), during);
      GOutcome outcome;
      const GHandle<SecretItem> item(secret_item_create_sync(collection.get(), schema(), attributesOf(entry).get(),
                                                             ("Palisade: " + describe(entry)).c_str(), value.get(),
                                                             SECRET_ITEM_CREATE_REPLACE, cancellable, outcome.place()));
      outcome.check();
    });
  });
}

std::optional<Error> SecretServiceKeychain::removeCredentialForAccount(const std::shared_ptr<Account>& account,
                                                                       const std::optional<std::string>& clientID) {
  return keychainAnswer([&] {
    const KeychainEntry entry = keychainEntry(account, clientID);
    const std::string during = "remove " + describe(entry);
    _session->run(during, [&](SecretService* service, GCancellable* cancellable) {
      const auto items = search(service, attributesOf(entry), SECRET_SEARCH_ALL, cancellable, during);
      for (const GList* each = items.get(); each != nullptr; each = each->next) {
        GOutcome outcome;
        secret_item_delete_sync(static_cast<SecretItem*>(each->data), cancellable, outcome.place());
        outcome.check();
      }
    });
  });
}

std::vector<std::string> SecretServiceKeychain::clientIDsWithCredentials(const std::shared_ptr<Account>& account) {
  const KeychainEntry entry = keychainEntry(account, std::nullopt);
  const std::string during = "list the credentials for " + entry.username;
  std::vector<std::string> clientIDs;
  _session->run(during, [&](SecretService* service, GCancellable* cancellable) {
    clientIDs.clear();
    const auto items = search(service, attributesOf(entry.accountID, kindClient), SECRET_SEARCH_ALL, cancellable, during);
    for (const GList* each = items.get(); each != nullptr; each = each->next) {
      const Attributes attributes(secret_item_get_attributes(static_cast<SecretItem*>(each->data)));
      const void* const clientID = g_hash_table_lookup(attributes.get(), clientAttribute);
      if (clientID != nullptr) clientIDs.emplace_back(static_cast<const char*>(clientID));
    }
  });
  std::ranges::sort(clientIDs);
  return clientIDs;
}

std::string SecretServiceKeychain::description() const { return "the session's Secret Service"; }

}  // namespace palisade
