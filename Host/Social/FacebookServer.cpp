#include "Host/Social/FacebookServer.h"

#include <algorithm>
#include <utility>
#include <vector>

#include "Host/Http/FormEncoding.h"

namespace palisade {
namespace {

// A name may hold any character, so each permission is a field of its own. Their order carries no meaning; it is fixed so that
// equal requests are equal in bytes.
void addPermissions(std::vector<FormField>& fields, const std::string& parameter, const PermissionSetRef& permissions) {
  if (permissions == nullptr) return;
  std::vector<std::string> names(permissions->begin(), permissions->end());
  std::sort(names.begin(), names.end());
  for (std::string& name : names) fields.emplace_back(parameter, std::move(name));
}

void addOptional(std::vector<FormField>& fields, const std::string& parameter, const std::optional<std::string>& value) {
  if (value) fields.emplace_back(parameter, *value);
}

HttpRequest post(const ServerConfiguration& configuration, const std::string& path, const std::vector<FormField>& fields,
                 const std::optional<std::string>& token) {
  return {.url = configuration.address.empty() ? std::string() : configuration.address + path,
          .bearerToken = token && !token->empty() ? token : std::nullopt,
          .form = formEncoded(fields)};
}

}  // namespace

std::string FacebookServer::name() const { return _configuration.address.substr(_configuration.address.rfind('/') + 1); }

HttpRequest FacebookServer::authorization(const std::string& appID, const std::string& bundleID,
                                          const PermissionSetRef& permissions, const std::optional<std::string>& audience,
                                          const std::optional<std::string>& token) const {
  const ServerConfiguration::Parameters& names = _configuration.parameters;
  std::vector<FormField> fields = {{names.appID, appID}, {names.bundleID, bundleID}};
  addPermissions(fields, names.permissions, permissions);
  addOptional(fields, names.audience, audience);
  return post(_configuration, _configuration.paths.authorization, fields, token);
}

HttpRequest FacebookServer::description(const PermissionSetRef& permissions, const std::optional<std::string>& audience,
                                        const std::optional<std::string>& token) const {
  std::vector<FormField> fields;
  addPermissions(fields, _configuration.parameters.permissions, permissions);
  addOptional(fields, _configuration.parameters.audience, audience);
  return post(_configuration, _configuration.paths.description, fields, token);
}

HttpRequest FacebookServer::invalidation(const std::string& appID, std::chrono::milliseconds age,
                                         const std::optional<std::string>& token) const {
  const ServerConfiguration::Parameters& names = _configuration.parameters;
  const std::vector<FormField> fields = {{names.appID, appID}, {names.age, std::to_string(age.count())}};
  return post(_configuration, _configuration.paths.invalidation, fields, token);
}

}  // namespace palisade
