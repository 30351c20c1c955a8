#pragma once

/// A keychain in memory. See `KeychainManager`.
///
/// Threads: safe from every thread. Errors: one switch for writes, one for removals; what is refused changes nothing.

#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <utility>

#include "Platform/KeychainManager.h"
#include "Testing/Instruments.h"

namespace palisade {

class FakeKeychainManager final : public KeychainManager {
 public:
  explicit FakeKeychainManager(Instruments instruments) : _instruments(instruments) {}

  /// Puts an entry with this token into the keychain before the plug-in looks; not traced.
  void addCredential(const std::string& accountID, const std::optional<std::string>& clientID,
                     std::optional<std::string> oauthToken);

  /// What the keychain holds under (account, client ID), or none; not traced.
  std::shared_ptr<const AccountCredential> entry(const std::string& accountID,
                                                 const std::optional<std::string>& clientID) const;

  /// Refuses every write, or every removal, from now on; none accepts them again.
  void refuseWrites(std::optional<Error> error);
  void refuseRemovals(std::optional<Error> error);

  std::shared_ptr<const AccountCredential> credentialForAccount(const std::shared_ptr<Account>& account,
                                                                const std::optional<std::string>& clientID) override;
  std::optional<Error> setCredentialForAccount(const std::shared_ptr<Account>& account,
                                               const std::optional<std::string>& clientID) override;
  std::optional<Error> removeCredentialForAccount(const std::shared_ptr<Account>& account,
                                                  const std::optional<std::string>& clientID) override;

 private:
  using Key = std::pair<std::string, std::optional<std::string>>;

  Instruments _instruments;
  mutable std::mutex _mutex;
  std::map<Key, std::shared_ptr<const AccountCredential>> _entries;
  std::optional<Error> _writeRefusal;
  std::optional<Error> _removalRefusal;
};

}  // namespace palisade
