#pragma once

/// Accounts and credentials for tests of the keychains.

#include <memory>
#include <optional>
#include <ostream>
#include <string>

#include "Host/Accounts/StoredAccount.h"
#include "Platform/AccountCredential.h"
#include "Platform/Format.h"

namespace palisade {

inline std::shared_ptr<Account> makeAccount(const std::string& id) {
  return std::make_shared<StoredAccount>(id, "user of " + id, "Account " + id);
}

/// The account, holding a credential to be written.
inline std::shared_ptr<Account> makeAccount(const std::string& id, const AccountCredential& credential) {
  auto account = makeAccount(id);
  account->setCredential(std::make_shared<const AccountCredential>(credential));
  return account;
}

/// What a credential says; prints and compares. A token out of a test is no secret.
struct CredentialContent {
  std::optional<std::string> token;
  std::string refreshToken = {};
  Date expiryDate = distantFuture;

  operator AccountCredential() const { return {token, refreshToken, expiryDate}; }
  friend bool operator==(const CredentialContent&, const CredentialContent&) = default;
};

/// None of no credential.
inline std::optional<CredentialContent> contentOf(const std::shared_ptr<const AccountCredential>& credential) {
  if (credential == nullptr) return std::nullopt;
  return CredentialContent{
      .token = credential->oauthToken(), .refreshToken = credential->refreshToken(), .expiryDate = credential->expiryDate()};
}

inline void PrintTo(const CredentialContent& content, std::ostream* stream) {
  *stream << "token " << content.token.value_or("none") << ", refresh token \"" << content.refreshToken << "\", until "
          << content.expiryDate.time_since_epoch().count();
}

inline void PrintTo(const Error& error, std::ostream* stream) { *stream << describe(error); }

}  // namespace palisade
