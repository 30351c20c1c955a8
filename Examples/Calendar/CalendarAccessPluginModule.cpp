// What the daemon finds in the module: one function, and through it the account type and the plug-in.

#include "CalendarAccessPlugin.h"

extern "C" PALISADE_EXPORT const palisade::AccountAccessPluginModule* accountAccessPluginModule(std::uint32_t daemonABINumber);

namespace palisade::example {
namespace {

bool supportsAccountTypeWithIdentifier(std::string_view identifier) noexcept {
  return identifier == AccountTypeIdentifierCalendar;
}

std::shared_ptr<AccountAccessPlugin> create(const PlatformServices& services) noexcept {
  try {
    return std::make_shared<CalendarAccessPlugin>(services);
  } catch (...) {
    return nullptr;
  }
}

}  // namespace
}  // namespace palisade::example

// One module serves one ABI number, whatever the daemon's is; the daemon compares the two.
const palisade::AccountAccessPluginModule* accountAccessPluginModule(std::uint32_t /*daemonABINumber*/) {
  static constexpr palisade::AccountAccessPluginModule module{
      .supportsAccountTypeWithIdentifier = palisade::example::supportsAccountTypeWithIdentifier,
      .create = palisade::example::create};
  return &module;
}
