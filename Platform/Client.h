#pragma once

/// A client application, as the daemon knows it. The daemon has established who is calling before a plug-in sees the client.
///
/// Threads: immutable, safe from every thread. Ownership: `std::shared_ptr`. Errors: no operation fails.

#include <optional>
#include <string>
#include <string_view>

namespace palisade {

class Client {
 public:
  virtual ~Client() = default;

  /// The reverse-DNS identifier of the application; none for a program that has none.
  virtual std::optional<std::string> bundleID() const = 0;

  /// The application's name as the user sees it, in the user's language.
  virtual std::string localizedAppName() const = 0;

  virtual bool hasEntitlement(std::string_view entitlement) const = 0;

  /// The client for log records and error messages, on one line.
  virtual std::string description() const = 0;
};

}  // namespace palisade
