#pragma once

/// Every kind of account store that there is: a fake, and the daemon's own. Each says how a test prepares it.

#include <functional>
#include <memory>
#include <ostream>
#include <string>
#include <vector>

#include "Platform/AccountStore.h"
#include "Platform/AuthorizationManager.h"
#include "Tests/Host/Store/Records.h"

namespace palisade {

class AccountStoreUnderTest {
 public:
  virtual ~AccountStoreUnderTest() = default;

  virtual AccountStore& store() = 0;
  virtual void addAccount(const std::string& accountTypeIdentifier, const std::string& name) = 0;

  AuthorizationManager& records() { return store().authorizationManager(); }
};

struct AccountStoreKind {
  const char* name;
  std::function<std::unique_ptr<AccountStoreUnderTest>()> make;
};

inline void PrintTo(const AccountStoreKind& kind, std::ostream* stream) { *stream << kind.name; }

std::vector<AccountStoreKind> accountStoreKinds();

}  // namespace palisade
