#pragma once

/// A keychain that is opened when it is first needed, and again each time that failed.
///
/// Threads: every operation may be called from any thread. Ownership: owns the keychain that it has opened. Errors: those of
/// opening it, from every operation, and then those of the keychain.

#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <string>

#include "Platform/KeychainManager.h"

namespace palisade {

class DeferredKeychain final : public KeychainManager {
 public:
  using Opener = std::function<std::unique_ptr<KeychainManager>()>;

  explicit DeferredKeychain(Opener open) : _open(std::move(open)) {}

  std::shared_ptr<const AccountCredential> credentialForAccount(const std::shared_ptr<Account>& account,
                                                                const std::optional<std::string>& clientID) override {
    return opened().credentialForAccount(account, clientID);
  }
  std::optional<Error> setCredentialForAccount(const std::shared_ptr<Account>& account,
                                               const std::optional<std::string>& clientID) override {
    return opened().setCredentialForAccount(account, clientID);
  }
  std::optional<Error> removeCredentialForAccount(const std::shared_ptr<Account>& account,
                                                  const std::optional<std::string>& clientID) override {
    return opened().removeCredentialForAccount(account, clientID);
  }

 private:
  KeychainManager& opened() {
    const std::lock_guard lock(_mutex);
    if (_keychain == nullptr) _keychain = _open();
    return *_keychain;
  }

  const Opener _open;
  std::mutex _mutex;
  std::unique_ptr<KeychainManager> _keychain;
};

}  // namespace palisade
