#include "Tests/Contract/AccountStoreKinds.h"

#include "Host/Accounts/SqliteAccountStore.h"
#include "Testing/FakeAccountStore.h"
#include "Tests/Host/TemporaryFolder.h"

namespace palisade {
namespace {

class FakeStore final : public AccountStoreUnderTest {
 public:
  AccountStore& store() override { return _store; }
  void addAccount(const std::string& accountTypeIdentifier, const std::string& name) override {
    _store.addAccount({.id = name, .type = accountTypeIdentifier, .description = name});
  }

 private:
  Trace _trace;
  FaultInjector _faults;
  FakeAuthorizationManager _records{{_trace, _faults}};
  FakeAccountStore _store{{_trace, _faults}, _records};
};

class RealStore final : public AccountStoreUnderTest {
 public:
  AccountStore& store() override { return _store; }
  void addAccount(const std::string& accountTypeIdentifier, const std::string& name) override {
    _store.addAccount(accountTypeIdentifier, name, name);
  }

 private:
  TemporaryFolder _folder;
  TestDirectory _clients;
  SqliteAccountStore _store{{.path = _folder.path() / "state" / "accounts.sqlite"}, _clients};
};

}  // namespace

std::vector<AccountStoreKind> accountStoreKinds() {
  return {{"Fake", [] { return std::make_unique<FakeStore>(); }}, {"Sqlite", [] { return std::make_unique<RealStore>(); }}};
}

}  // namespace palisade
