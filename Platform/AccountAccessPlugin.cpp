#include "Platform/AccountAccessPlugin.h"

#include <stdexcept>
#include <string>

namespace palisade {
namespace {

const PlatformServices& complete(const PlatformServices& services) {
  if (services.abiNumber != AccountAccessPluginABINumber) {
    throw std::invalid_argument("The platform services have ABI number " + std::to_string(services.abiNumber) +
                                ", this plug-in was built for " + std::to_string(AccountAccessPluginABINumber) + ".");
  }
  const struct {
    const void* service;
    const char* name;
  } required[] = {
      {services.log, "log"},
      {services.keychain, "keychain"},
      {services.social, "social"},
      {services.alert, "alert"},
      {services.preferences, "preferences"},
      {services.notifications, "notifications"},
      {services.queues, "queues"},
      {services.json, "json"},
      {services.strings, "strings"},
  };
  for (const auto& [service, name] : required) {
    if (service == nullptr) throw std::invalid_argument(std::string("The platform services lack '") + name + "'.");
  }
  return services;
}

}  // namespace

AccountAccessPlugin::AccountAccessPlugin(const PlatformServices& services) : _services(complete(services)) {}

}  // namespace palisade
