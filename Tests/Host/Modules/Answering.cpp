/// A module that answers one of the descriptions below, chosen by ANSWER when it is compiled.

#include "Platform/AccountAccessPlugin.h"

namespace palisade {

inline bool supports(std::string_view identifier) noexcept { return identifier == "supported"; }
inline std::shared_ptr<AccountAccessPlugin> createNone(const PlatformServices&) noexcept { return nullptr; }

inline constexpr AccountAccessPluginModule good = {.supportsAccountTypeWithIdentifier = supports, .create = createNone};

// Only the number may be read: the rest would be refused for other reasons.
inline constexpr AccountAccessPluginModule ofAnotherABI = {.abiNumber = AccountAccessPluginABINumber + 6, .size = 0};

inline constexpr AccountAccessPluginModule smaller = {.size = 8};
inline constexpr AccountAccessPluginModule larger = {
    .size = sizeof(AccountAccessPluginModule) + 8, .supportsAccountTypeWithIdentifier = supports, .create = createNone};
inline constexpr AccountAccessPluginModule withoutCreate = {.supportsAccountTypeWithIdentifier = supports};
inline constexpr AccountAccessPluginModule withoutSupports = {.create = createNone};

constexpr const AccountAccessPluginModule* answer(const AccountAccessPluginModule& module) { return &module; }
constexpr const AccountAccessPluginModule* answer(std::nullptr_t) { return nullptr; }
inline constexpr std::nullptr_t nothing = nullptr;

}  // namespace palisade

extern "C" PALISADE_EXPORT const palisade::AccountAccessPluginModule* accountAccessPluginModule(std::uint32_t daemonABINumber) {
  // A loader that told another number than its own would be answered nothing.
  return daemonABINumber == palisade::AccountAccessPluginABINumber ? palisade::answer(palisade::ANSWER) : nullptr;
}
