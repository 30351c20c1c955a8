// The module's entry point. Beside it the module shows whoever loads it the names of the permission categories, and nothing
// else.

#include "Facebook/Palisade/VXFacebookAccountAccessPlugin.h"

extern "C" PALISADE_EXPORT const palisade::AccountAccessPluginModule* accountAccessPluginModule(std::uint32_t daemonABINumber);

namespace palisade {
namespace {

bool supportsAccountTypeWithIdentifier(std::string_view identifier) noexcept {
  return VXFacebookAccountAccessPlugin::supportsAccountTypeWithIdentifier(identifier);
}

std::shared_ptr<AccountAccessPlugin> create(const PlatformServices& services) noexcept {
  try {
    return std::make_shared<VXFacebookAccountAccessPlugin>(services);
  } catch (...) {
    // A daemon whose services do not fit gets no plug-in; it knows its own services and says which one is missing.
    return nullptr;
  }
}

}  // namespace
}  // namespace palisade

// One module serves one ABI number; the daemon compares it with its own.
const palisade::AccountAccessPluginModule* accountAccessPluginModule(std::uint32_t /*daemonABINumber*/) {
  static constexpr palisade::AccountAccessPluginModule module{
      .supportsAccountTypeWithIdentifier = palisade::supportsAccountTypeWithIdentifier, .create = palisade::create};
  return &module;
}
