#include "Host/Keychain/KeychainChoice.h"

#include <array>
#include <utility>

namespace palisade {
namespace {

constexpr std::array<std::pair<KeychainChoice, std::string_view>, 3> names{{{KeychainChoice::automatic, "automatic"},
                                                                            {KeychainChoice::secretService, "secret-service"},
                                                                            {KeychainChoice::vault, "vault"}}};

}  // namespace

std::optional<KeychainChoice> keychainChoiceNamed(std::string_view name) {
  for (const auto& [choice, itsName] : names) {
    if (itsName == name) return choice;
  }
  return std::nullopt;
}

std::string_view nameOf(KeychainChoice choice) {
  for (const auto& [each, itsName] : names) {
    if (each == choice) return itsName;
  }
  return {};
}

}  // namespace palisade
