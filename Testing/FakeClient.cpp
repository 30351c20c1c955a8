#include "Testing/FakeClient.h"

#include <algorithm>

#include "Testing/TraceValue.h"

namespace palisade {

std::string FakeClient::idOf(const Client& client) {
  const auto* fake = dynamic_cast<const FakeClient*>(&client);
  return fake == nullptr ? client.description() : fake->_data.id;
}

std::optional<std::string> FakeClient::bundleID() const {
  _instruments.faults.enter("Client.bundleID");
  return _data.bundleID;
}

std::string FakeClient::localizedAppName() const {
  _instruments.faults.enter("Client.localizedAppName");
  return _data.appName;
}

bool FakeClient::hasEntitlement(std::string_view entitlement) const {
  _instruments.faults.enter("Client.hasEntitlement");
  const bool result = std::ranges::find(_data.entitlements, entitlement) != _data.entitlements.end();
  _instruments.trace.record("Client.hasEntitlement",
                            {{"client", traceClient(this)}, {"entitlement", entitlement}, {"result", result}});
  return result;
}

std::string FakeClient::description() const {
  _instruments.faults.enter("Client.description");
  return _data.description;
}

}  // namespace palisade
