#pragma once

/// A client that the directory does not know any more, as its record remembers it: what it was granted can still be listed and
/// taken back. It holds no entitlements. See `Client`.

#include <optional>
#include <string>
#include <string_view>
#include <utility>

#include "Platform/Client.h"

namespace palisade {

class RememberedClient final : public Client {
 public:
  RememberedClient(std::string id, std::optional<std::string> bundleID, std::string appName)
      : _id(std::move(id)),
        _bundleID(std::move(bundleID)),
        _appName(std::move(appName)) {}

  std::optional<std::string> bundleID() const override { return _bundleID; }
  std::string localizedAppName() const override { return _appName; }
  bool hasEntitlement(std::string_view) const override { return false; }
  std::string description() const override { return _id; }

 private:
  std::string _id;
  std::optional<std::string> _bundleID;
  std::string _appName;
};

}  // namespace palisade
