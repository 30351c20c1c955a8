#pragma once

/// What the keychain keeps for an account, or for one client of an account: an OAuth 2 token (RFC 6749).
///
/// Threads: immutable, shared freely. Ownership: by `std::shared_ptr`. The token is a secret: it belongs in the keychain and in
/// signed requests, never in a log, an argument list or plain storage.

#include <optional>
#include <string>
#include <utility>

#include "Platform/Date.h"

namespace palisade {

class AccountCredential {
 public:
  AccountCredential(std::optional<std::string> oauth2Token, std::string refreshToken, Date expiryDate)
      : _oauthToken(std::move(oauth2Token)),
        _refreshToken(std::move(refreshToken)),
        _expiryDate(expiryDate) {}

  const std::optional<std::string>& oauthToken() const { return _oauthToken; }
  const std::string& refreshToken() const { return _refreshToken; }
  Date expiryDate() const { return _expiryDate; }

 private:
  std::optional<std::string> _oauthToken;
  std::string _refreshToken;
  Date _expiryDate;
};

}  // namespace palisade
