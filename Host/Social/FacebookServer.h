#pragma once

/// The requests that the Facebook server understands, for whoever sends them.
///
/// Threads: immutable once made. Ownership: a value. Errors: none; a request to a server that is not configured fails when it
/// is sent. A token that is missing or empty leaves the request unsigned.

#include <chrono>
#include <optional>
#include <string>

#include "Host/Http/HttpClient.h"
#include "Host/Social/ServerConfiguration.h"
#include "Platform/PermissionSet.h"

namespace palisade {

class FacebookServer {
 public:
  explicit FacebookServer(ServerConfiguration configuration) : _configuration(std::move(configuration)) {}

  /// "127.0.0.1:8443"; for sentences.
  std::string name() const;

  /// Asks for a token for the app. Permissions and audience may be none and are then left out.
  HttpRequest authorization(const std::string& appID, const std::string& bundleID, const PermissionSetRef& permissions,
                            const std::optional<std::string>& audience, const std::optional<std::string>& token) const;

  /// Asks for words for the permissions.
  HttpRequest description(const PermissionSetRef& permissions, const std::optional<std::string>& audience,
                          const std::optional<std::string>& token) const;

  /// Asks that what the app was issued until `age` ago is made invalid. Tokens that were issued later stay valid: the person
  /// may have granted access again before the server could be reached.
  HttpRequest invalidation(const std::string& appID, std::chrono::milliseconds age,
                           const std::optional<std::string>& token) const;

 private:
  ServerConfiguration _configuration;
};

}  // namespace palisade
