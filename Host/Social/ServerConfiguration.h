#pragma once

/// Where the Facebook server is and how it is spoken to, as server.toml says it.
///
/// The names of paths and parameters have the values of the server contract (Docs/server-contract.yaml) unless the file says
/// otherwise. Threads and ownership: a value. Errors: a table that holds something unknown, of the wrong type or out of range
/// is a `ServerConfigurationError` that names the key and says what belongs there; which file it was is for the caller to add.

#include <chrono>
#include <cstddef>
#include <filesystem>
#include <optional>
#include <stdexcept>
#include <string>

#include "Host/Http/HttpClient.h"
#include "Platform/Value.h"

namespace palisade {

class ServerConfigurationError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

struct ServerConfiguration {
  ServerConfiguration() = default;
  explicit ServerConfiguration(const Dictionary& table);

  /// "https://HOST" or "https://HOST:PORT"; empty when no server is configured, so that every request fails and says so.
  std::string address;
  /// See `HttpClientOptions`.
  std::optional<std::filesystem::path> certificateAuthorities;
  std::optional<std::string> proxy;

  struct Paths {
    std::string authorization = "/oauth/authorization";
    std::string description = "/oauth/permission-description";
    std::string invalidation = "/oauth/invalidation";
  } paths;

  struct Parameters {
    std::string appID = "app_id";
    std::string bundleID = "bundle_id";
    std::string permissions = "permissions";
    std::string audience = "audience";
    std::string age = "age";
  } parameters;

  struct Limits {
    std::chrono::seconds connect{30};
    std::chrono::seconds stall{60};
    std::chrono::seconds total{300};
    std::size_t bodyBytes = 64 * 1024;
  } limits;

  HttpClientOptions httpOptions() const;
};

}  // namespace palisade
