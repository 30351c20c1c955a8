#include "Testing/FakeAccount.h"

#include "Platform/AccountType.h"
#include "Testing/TraceValue.h"

namespace palisade {

std::string FakeAccount::idOf(const Account& account) {
  const auto* fake = dynamic_cast<const FakeAccount*>(&account);
  return fake == nullptr ? account.description() : fake->_data.id;
}

std::string FakeAccount::description() const {
  _instruments.faults.enter("Account.description");
  return _data.description;
}

void FakeAccount::setAccountType(std::shared_ptr<const AccountType> accountType) {
  _instruments.faults.enter("Account.setAccountType");
  _instruments.trace.record(
      "Account.setAccountType",
      {{"account", traceAccount(this)}, {"accountType", accountType == nullptr ? Value() : Value(accountType->identifier())}});
  _accountType = std::move(accountType);
}

std::shared_ptr<const AccountCredential> FakeAccount::credential() const {
  _instruments.faults.enter("Account.credential");
  return _credential;
}

void FakeAccount::setCredential(std::shared_ptr<const AccountCredential> credential) {
  _instruments.faults.enter("Account.setCredential");
  _instruments.trace.record("Account.setCredential",
                            {{"account", traceAccount(this)}, {"credential", traceCredential(credential)}});
  _credential = std::move(credential);
}

}  // namespace palisade
