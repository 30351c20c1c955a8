#include "Tools/PluginReplay/Scenario.h"

#include <algorithm>
#include <utility>

namespace palisade {
namespace {

constexpr std::pair<std::string_view, OperationName> operationNames[] = {
    {"supportsAccountType", OperationName::supportsAccountType},
    {"handleAccessRequest", OperationName::handleAccessRequest},
    {"authorizeAccess", OperationName::authorizeAccess},
    {"revokeAccess", OperationName::revokeAccess},
    {"revokeAllAccess", OperationName::revokeAllAccess},
    {"environmentChange", OperationName::environmentChange},
    {"newPlugin", OperationName::newPlugin},
};

}  // namespace

std::string_view nameOf(OperationName name) {
  return std::ranges::find(operationNames, name, [](const auto& each) { return each.second; })->first;
}

std::optional<OperationName> operationNamed(std::string_view name) {
  const auto found = std::ranges::find(operationNames, name, [](const auto& each) { return each.first; });
  return found == std::end(operationNames) ? std::nullopt : std::optional(found->second);
}

}  // namespace palisade
