#include "Host/Keychain/SecretServiceHalves.h"

#include <algorithm>
#include <vector>

#include "Host/Keychain/KeychainEntry.h"
#include "Host/Keychain/KeychainError.h"
#include "Host/Keychain/SecretServiceSession.h"

namespace palisade {
namespace {

constexpr const char* serviceAttribute = "service";
constexpr const char* keyAttribute = "key";
constexpr const char* label = "Palisade: half of the key to the accounts' tokens";
constexpr const char* opening = "open the vault";

using Attributes = GHandle<GHashTable>;

const SecretSchema* schema() {
  static const GHandle<SecretSchema> made(secret_schema_new("com.veltran.Accounts1.KeyHalf", SECRET_SCHEMA_NONE,
                                                            serviceAttribute, SECRET_SCHEMA_ATTRIBUTE_STRING, keyAttribute,
                                                            SECRET_SCHEMA_ATTRIBUTE_STRING, nullptr));
  return made.get();
}

// The schema under which credentials lay here.
const SecretSchema* credentialSchema() {
  static const GHandle<SecretSchema> made(secret_schema_new("com.veltran.Accounts1.Credential", SECRET_SCHEMA_NONE,
                                                            serviceAttribute, SECRET_SCHEMA_ATTRIBUTE_STRING, nullptr));
  return made.get();
}

Attributes attributesOf(const std::string& keyID) {
  return Attributes(secret_attributes_build(schema(), serviceAttribute, std::string(keychainServiceName).c_str(), keyAttribute,
                                            keyID.c_str(), nullptr));
}

GHandle<SecretCollection> defaultCollection(SecretService* service, GCancellable* cancellable) {
  GOutcome outcome;
  GHandle<SecretCollection> collection(secret_collection_for_alias_sync(service, SECRET_COLLECTION_DEFAULT,
                                                                        SECRET_COLLECTION_NONE, cancellable, outcome.place()));
  outcome.check();
  return collection;
}

KeychainError locked() {
  return {KeychainErrorLocked,
          "cannot open the vault: the session's keyring, which holds half of its key, is locked; unlock it "
          "and try again"};
}

// The default collection, which is there and open.
GHandle<SecretCollection> openCollection(SecretService* service, GCancellable* cancellable) {
  GHandle<SecretCollection> collection = defaultCollection(service, cancellable);
  if (collection == nullptr) {
    throw KeychainError(KeychainErrorUnavailable,
                        "cannot open the vault: the session's Secret Service, which is to hold half of its key, has no default "
                        "keyring; make one, or write keychain = \"vault\" into accountd.toml");
  }
  if (secret_collection_get_locked(collection.get()) != FALSE) throw locked();
  return collection;
}

// Whoever holds the list holds the items.
GHandle<GList> itemsWith(SecretService* service, const SecretSchema* itsSchema, const Attributes& attributes,
                         GCancellable* cancellable) {
  GOutcome outcome;
  GHandle<GList> items(
      secret_service_search_sync(service, itsSchema, attributes.get(), SECRET_SEARCH_ALL, cancellable, outcome.place()));
  outcome.check();
  return items;
}

// The oldest first: what was added to hide the right one comes after it.
std::vector<SecretItem*> byAge(const GList* items) {
  std::vector<SecretItem*> sorted;
  for (; items != nullptr; items = items->next) sorted.push_back(static_cast<SecretItem*>(items->data));
  std::ranges::stable_sort(sorted, {}, [](SecretItem* item) { return secret_item_get_created(item); });
  return sorted;
}

bool isLocked(SecretItem* item) { return secret_item_get_locked(item) != FALSE; }

// What the item holds, if that is a half. An item that goes away while it is read holds none.
std::optional<KeyHalf> halfIn(SecretItem* item, GCancellable* cancellable) {
  GOutcome outcome;
  if (secret_item_load_secret_sync(item, cancellable, outcome.place()) == FALSE) {
    if (g_cancellable_is_cancelled(cancellable) != FALSE) outcome.check();
    return std::nullopt;
  }
  const GHandle<SecretValue> value(secret_item_get_secret(item));
  if (value == nullptr) return std::nullopt;
  gsize size = 0;
  const gchar* const digits = secret_value_get(value.get(), &size);
  return KeyHalf::fromHexadecimal({digits, size});
}

}  // namespace

SecretServiceHalves::SecretServiceHalves(std::chrono::milliseconds timeLimit)
    : _session(std::make_unique<SecretServiceSession>(timeLimit)) {}

SecretServiceHalves::~SecretServiceHalves() = default;

bool SecretServiceHalves::isPresent() {
  bool hasCollection = false;
  try {
    _session->run("look for a keyring", [&](SecretService* service, GCancellable* cancellable) {
      hasCollection = defaultCollection(service, cancellable) != nullptr;
    });
  } catch (const KeychainError& error) {
    if (error.code() != KeychainErrorUnavailable) throw;
  }
  return hasCollection;
}

void SecretServiceHalves::add(const std::string& keyID, const KeyHalf& half) {
  GHandle<SecretValue> value;
  half.withHexadecimal([&](std::string_view digits) {
    // The library copies the digits into memory that is never swapped.
    value.reset(secret_value_new(digits.data(), static_cast<gssize>(digits.size()), "text/plain"));
  });
  _session->run(opening, [&](SecretService* service, GCancellable* cancellable) {
    const auto collection = openCollection(service, cancellable);
    GOutcome outcome;
    const GHandle<SecretItem> item(secret_item_create_sync(collection.get(), schema(), attributesOf(keyID).get(), label,
                                                           value.get(), SECRET_ITEM_CREATE_NONE, cancellable, outcome.place()));
    outcome.check();
  });
}

std::size_t SecretServiceHalves::offer(const std::string& keyID, const Take& take) {
  std::size_t count = 0;
  _session->run(opening, [&](SecretService* service, GCancellable* cancellable) {
    count = 0;
    bool mayBeMore = false;
    const auto items = itemsWith(service, schema(), attributesOf(keyID), cancellable);
    for (SecretItem* const item : byAge(items.get())) {
      mayBeMore = mayBeMore || isLocked(item);
      const auto half = isLocked(item) ? std::nullopt : halfIn(item, cancellable);
      if (!half) continue;
      ++count;
      if (take(*half)) return;
    }
    if (mayBeMore) throw locked();
    // Nothing found in a locked keyring says nothing.
    openCollection(service, cancellable);
  });
  return count;
}

std::size_t SecretServiceHalves::removeCredentials() {
  std::size_t count = 0;
  _session->run("remove credentials from the session's Secret Service", [&](SecretService* service, GCancellable* cancellable) {
    const Attributes ours(
        secret_attributes_build(credentialSchema(), serviceAttribute, std::string(keychainServiceName).c_str(), nullptr));
    const auto items = itemsWith(service, credentialSchema(), ours, cancellable);
    for (SecretItem* const item : byAge(items.get())) {
      // To unlock it the user would be asked.
      if (isLocked(item)) continue;
      GOutcome outcome;
      secret_item_delete_sync(item, cancellable, outcome.place());
      outcome.check();
      ++count;
    }
  });
  return count;
}

}  // namespace palisade
