#pragma once

/// An account out of a test, fresh from one look-up. See `Account`.

#include <memory>
#include <string>
#include <utility>

#include "Platform/Account.h"
#include "Testing/Instruments.h"

namespace palisade {

struct FakeAccountData {
  /// Tells accounts apart in the store, the keychain and the trace; the plug-in never sees it.
  std::string id;
  /// The identifier of its account type.
  std::string type;
  std::string description = {};
};

class FakeAccount final : public Account {
 public:
  FakeAccount(Instruments instruments, FakeAccountData data) : _instruments(instruments), _data(std::move(data)) {}

  /// The ID of a fake account; another account's description.
  static std::string idOf(const Account& account);

  std::string description() const override;
  void setAccountType(std::shared_ptr<const AccountType> accountType) override;
  std::shared_ptr<const AccountCredential> credential() const override;
  void setCredential(std::shared_ptr<const AccountCredential> credential) override;

 private:
  Instruments _instruments;
  FakeAccountData _data;
  std::shared_ptr<const AccountType> _accountType;
  std::shared_ptr<const AccountCredential> _credential;
};

}  // namespace palisade
