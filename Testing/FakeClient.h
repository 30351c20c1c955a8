#pragma once

/// A client application out of a test. See `Client`.

#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "Platform/Client.h"
#include "Testing/Instruments.h"

namespace palisade {

struct FakeClientData {
  /// Tells clients apart in the store and in the trace; the plug-in never sees it.
  std::string id;
  std::optional<std::string> bundleID = std::nullopt;
  std::string appName = {};
  std::string description = {};
  std::vector<std::string> entitlements = {};
};

class FakeClient final : public Client {
 public:
  FakeClient(Instruments instruments, FakeClientData data) : _instruments(instruments), _data(std::move(data)) {}

  /// The ID of a fake client; another client's description.
  static std::string idOf(const Client& client);

  std::optional<std::string> bundleID() const override;
  std::string localizedAppName() const override;
  bool hasEntitlement(std::string_view entitlement) const override;
  std::string description() const override;

 private:
  Instruments _instruments;
  FakeClientData _data;
};

}  // namespace palisade
