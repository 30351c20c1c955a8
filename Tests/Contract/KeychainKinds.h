#pragma once

/// Every kind of keychain that there is: a fake, the vault whose key is a file, and the one with half of its key in a real
/// keyring daemon.

#include <functional>
#include <memory>
#include <ostream>
#include <string>
#include <vector>

#include "Platform/Account.h"
#include "Platform/KeychainManager.h"

namespace palisade {

class KeychainUnderTest {
 public:
  virtual ~KeychainUnderTest() = default;

  virtual KeychainManager& keychain() = 0;

  /// A fresh object for the account of that ID, as a look-up hands it out.
  virtual std::shared_ptr<Account> account(const std::string& id) = 0;
};

struct KeychainKind {
  const char* name;
  std::function<std::unique_ptr<KeychainUnderTest>()> make;
};

inline void PrintTo(const KeychainKind& kind, std::ostream* stream) { *stream << kind.name; }

std::vector<KeychainKind> keychainKinds();

/// The kinds that can list the clients with credentials: the host's own.
std::vector<KeychainKind> listingKeychainKinds();

}  // namespace palisade
