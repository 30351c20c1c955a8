#pragma once

/// What the vault's key is made of, in the words of the settings.
///
/// Threads: pure functions. Errors: none.

#include <optional>
#include <string_view>

namespace palisade {

enum class KeychainChoice {
  automatic,      ///< as the key there is; for a first one the Secret Service where one answers, else the file alone
  secretService,  ///< a file of the user's own and the session's Secret Service, half of the key each
  vault           ///< the file alone
};

/// "automatic", "secret-service" or "vault"; none for every other word.
std::optional<KeychainChoice> keychainChoiceNamed(std::string_view name);
std::string_view nameOf(KeychainChoice choice);

}  // namespace palisade
