#pragma once

/// A kind of account, told by its identifier (`AccountTypeIdentifierFacebook`, say). Immutable and shared between threads.

#include <string>
#include <utility>

namespace palisade {

class AccountType {
 public:
  explicit AccountType(std::string identifier) : _identifier(std::move(identifier)) {}

  const std::string& identifier() const { return _identifier; }

 private:
  std::string _identifier;
};

}  // namespace palisade
