#pragma once

/// The accounts of a test, and the way to its records. See `AccountStore`.
///
/// Threads: safe from every thread. Every look-up makes fresh account objects.

#include <memory>
#include <mutex>
#include <string_view>
#include <utility>
#include <vector>

#include "Platform/AccountStore.h"
#include "Testing/FakeAccount.h"
#include "Testing/FakeAuthorizationManager.h"
#include "Testing/Instruments.h"

namespace palisade {

class FakeAccountStore final : public AccountStore {
 public:
  FakeAccountStore(Instruments instruments, FakeAuthorizationManager& authorizations)
      : _instruments(instruments),
        _authorizations(authorizations) {}

  /// Puts an account behind those that are there; not traced.
  void addAccount(FakeAccountData account) {
    const std::lock_guard lock(_mutex);
    _accounts.push_back(std::move(account));
  }

  std::vector<std::shared_ptr<Account>> accountsWithAccountTypeIdentifier(std::string_view identifier) override {
    _instruments.faults.enter("AccountStore.accountsWithAccountTypeIdentifier");
    _instruments.trace.record("AccountStore.accountsWithAccountTypeIdentifier", {{"identifier", identifier}});
    std::vector<std::shared_ptr<Account>> found;
    const std::lock_guard lock(_mutex);
    for (const FakeAccountData& account : _accounts) {
      if (account.type == identifier) found.push_back(std::make_shared<FakeAccount>(_instruments, account));
    }
    return found;
  }

  AuthorizationManager& authorizationManager() override {
    _instruments.faults.enter("AccountStore.authorizationManager");
    return _authorizations;
  }

 private:
  Instruments _instruments;
  FakeAuthorizationManager& _authorizations;
  std::mutex _mutex;
  std::vector<FakeAccountData> _accounts;
};

}  // namespace palisade
