#include "Host/Identity/RegisteredClient.h"

#include <algorithm>

namespace palisade {

std::string nameOf(ClientClass clientClass) {
  switch (clientClass) {
    case ClientClass::sandboxed: return "sandboxed";
    case ClientClass::unknownSandbox: return "unknown sandbox";
    case ClientClass::unit: return "unit";
    case ClientClass::bare: break;
  }
  return "bare";
}

bool RegisteredClient::hasEntitlement(std::string_view entitlement) const {
  return std::ranges::find(_description.entitlements, entitlement) != _description.entitlements.end();
}

}  // namespace palisade
