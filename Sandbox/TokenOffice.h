#pragma once

/// What the sandbox's server does when nothing goes wrong: issues tokens, describes permissions, invalidates tokens, and tells
/// the holder of a token what it is good for. The rules are those of Docs/server-contract.yaml.
///
/// Threads: every operation may be called from any thread. Ownership: keeps what it issued until it is destroyed; nothing is
/// stored. Errors: answers of the contract; no operation fails.

#include <chrono>
#include <cstdint>
#include <map>
#include <mutex>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "Sandbox/Answer.h"
#include "Sandbox/PermissionList.h"

namespace palisade::sandbox {

using Permissions = std::set<std::string>;

struct AuthorizationForm {
  std::string appID;
  std::string bundleID;
  Permissions permissions;
  std::string audience;
};

class TokenOffice {
 public:
  /// `masterToken` is the one token that signs requests.
  TokenOffice(std::string masterToken, PermissionList permissions);

  Answer authorize(const std::optional<std::string>& masterToken, const AuthorizationForm& form);
  Answer describe(const std::optional<std::string>& masterToken, const Permissions& permissions) const;

  /// Invalidates what the app was issued until `age` ago.
  Answer invalidate(const std::optional<std::string>& masterToken, const std::string& appID, std::chrono::milliseconds age);

  Answer me(const std::optional<std::string>& token) const;

  /// Every token that was issued, for whoever tries the sandbox out.
  Answer issued() const;

 private:
  struct Token {
    std::string text;
    AuthorizationForm form;
    std::chrono::steady_clock::time_point issuedAt;
    bool isValid = true;
  };

  const std::string _masterToken;
  const PermissionList _permissions;

  mutable std::mutex _mutex;
  std::vector<Token> _tokens;  // guarded by the mutex, in the order in which they were issued
};

/// `bytes` random bytes in hexadecimal digits.
std::string randomText(std::size_t bytes);

}  // namespace palisade::sandbox
