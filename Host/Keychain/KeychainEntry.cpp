#include "Host/Keychain/KeychainEntry.h"

#include "Host/Accounts/StoredAccount.h"
#include "Host/Json/Json.h"
#include "Host/Keychain/KeychainError.h"
#include "Host/Secrets/KnownSecrets.h"

namespace palisade {
namespace {

constexpr const char* tokenKey = "oauthToken";
constexpr const char* refreshTokenKey = "refreshToken";
constexpr const char* expiryDateKey = "expiryDate";

std::optional<Dictionary> read(std::string_view text) {
  const JsonParseResult result = NlohmannJsonParser(1, NullCharacters::refused).parse(text, JsonFragments::refused);
  if (!result.value || result.value->dictionary() == nullptr) return std::nullopt;
  return *result.value->dictionary();
}

// From here on no log and no error of this process shows it.
void makeKnown(const AccountCredential& credential) {
  if (credential.oauthToken()) KnownSecrets::ofProcess().remember(*credential.oauthToken());
  KnownSecrets::ofProcess().remember(credential.refreshToken());
}

}  // namespace

KeychainEntry keychainEntry(const std::shared_ptr<Account>& account, const std::optional<std::string>& clientID) {
  const auto* const stored = dynamic_cast<const StoredAccount*>(account.get());
  if (stored == nullptr) {
    throw KeychainError(KeychainErrorForeignAccount,
                        "cannot use the keychain: the account object is not out of the account store");
  }
  return {.accountID = stored->id(), .clientID = clientID, .username = stored->username()};
}

std::string describe(const KeychainEntry& entry) {
  const std::string ofWhom = entry.clientID ? "of " + *entry.clientID + " for " : std::string("of account ");
  return "the credential " + ofWhom + entry.username;
}

std::string secretTextOfCredential(const std::shared_ptr<Account>& account, const KeychainEntry& entry) {
  const std::shared_ptr<const AccountCredential> credential = account->credential();
  if (credential == nullptr) {
    throw KeychainError(KeychainErrorNotRepresentable, "cannot store " + describe(entry) + ": the account object holds none");
  }
  makeKnown(*credential);
  Dictionary content;
  if (credential->oauthToken()) content.set(tokenKey, *credential->oauthToken());
  content.set(refreshTokenKey, credential->refreshToken());
  content.set(expiryDateKey, std::int64_t{credential->expiryDate().time_since_epoch().count()});
  if (!survivesJson(content, 1)) {
    throw KeychainError(KeychainErrorNotRepresentable,
                        "cannot store " + describe(entry) + ": a token is not UTF-8 or holds U+0000");
  }
  return writeJson(content);
}

std::shared_ptr<const AccountCredential> credentialInSecretText(std::string_view text, const KeychainEntry& entry) {
  const std::optional<Dictionary> content = read(text);
  const Value* const token = content ? content->find(tokenKey) : nullptr;
  const Value* const refreshToken = content ? content->find(refreshTokenKey) : nullptr;
  const Value* const expiryDate = content ? content->find(expiryDateKey) : nullptr;
  const bool isOurs = (token == nullptr || token->string() != nullptr) && refreshToken != nullptr &&
                      refreshToken->string() != nullptr && expiryDate != nullptr && expiryDate->integer() != nullptr;
  if (!isOurs) {
    throw KeychainError(KeychainErrorTampered, "cannot read " + describe(entry) +
                                                   ": the entry is not what was written; remove it and grant access again");
  }
  auto credential =
      std::make_shared<const AccountCredential>(token == nullptr ? std::nullopt : std::optional(*token->string()),
                                                *refreshToken->string(), Date(std::chrono::seconds(*expiryDate->integer())));
  makeKnown(*credential);
  return credential;
}

}  // namespace palisade
