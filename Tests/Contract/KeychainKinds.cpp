#include "Tests/Contract/KeychainKinds.h"

#include "Host/Keychain/VaultKeychain.h"
#include "Testing/FakeAccount.h"
#include "Testing/FakeKeychainManager.h"
#include "Tests/Host/Store/KeychainEntries.h"
#include "Tests/Host/Store/PrivateSession.h"

namespace palisade {
namespace {

class FakeOne final : public KeychainUnderTest {
 public:
  KeychainManager& keychain() override { return _keychain; }
  std::shared_ptr<Account> account(const std::string& id) override {
    return std::make_shared<FakeAccount>(_instruments, FakeAccountData{.id = id, .type = "type"});
  }

 private:
  Trace _trace;
  FaultInjector _faults;
  const Instruments _instruments{_trace, _faults};
  FakeKeychainManager _keychain{_instruments};
};

class Vault final : public KeychainUnderTest {
 public:
  KeychainManager& keychain() override { return _keychain; }
  std::shared_ptr<Account> account(const std::string& id) override { return makeAccount(id); }

 private:
  TemporaryFolder _folder;
  VaultKeychain _keychain{
      {.choice = KeychainChoice::vault, .path = _folder.path() / "vault.sqlite", .keyFile = _folder.path() / "vault.key"}};
};

class VaultWithService final : public KeychainUnderTest {
 public:
  VaultWithService() { _session.startKeyring(); }
  KeychainManager& keychain() override { return _keychain; }
  std::shared_ptr<Account> account(const std::string& id) override { return makeAccount(id); }

 private:
  PrivateSession _session;
  VaultKeychain _keychain{{.choice = KeychainChoice::secretService,
                           .path = _session.home() / "vault.sqlite",
                           .keyFile = _session.home() / "vault.key"}};
};

}  // namespace

std::vector<KeychainKind> keychainKinds() {
  std::vector<KeychainKind> kinds = listingKeychainKinds();
  kinds.push_back({"Fake", [] { return std::make_unique<FakeOne>(); }});
  return kinds;
}

std::vector<KeychainKind> listingKeychainKinds() {
  return {{"Vault", [] { return std::make_unique<Vault>(); }},
          {"VaultWithService", [] { return std::make_unique<VaultWithService>(); }}};
}

}  // namespace palisade
