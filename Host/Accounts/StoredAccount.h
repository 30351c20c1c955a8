#pragma once

/// An account out of the daemon's store, fresh from one look-up: what the platform's `Account` promises, and the identity that
/// the store and the keychain know it by. See `Account`.

#include <memory>
#include <string>
#include <utility>

#include "Platform/Account.h"

namespace palisade {

class StoredAccount final : public Account {
 public:
  /// `id` is never used for another account, not even after this one has been removed.
  StoredAccount(std::string id, std::string username, std::string description)
      : _id(std::move(id)),
        _username(std::move(username)),
        _description(std::move(description)) {}

  const std::string& id() const { return _id; }
  const std::string& username() const { return _username; }

  std::string description() const override { return _description; }

  /// None until it has been set.
  const std::shared_ptr<const AccountType>& accountType() const { return _accountType; }
  void setAccountType(std::shared_ptr<const AccountType> accountType) override { _accountType = std::move(accountType); }

  std::shared_ptr<const AccountCredential> credential() const override { return _credential; }
  void setCredential(std::shared_ptr<const AccountCredential> credential) override { _credential = std::move(credential); }

 private:
  std::string _id;
  std::string _username;
  std::string _description;
  std::shared_ptr<const AccountType> _accountType;
  std::shared_ptr<const AccountCredential> _credential;
};

}  // namespace palisade
