#include "Host/Daemon/AlertSubjects.h"

namespace palisade {
namespace {

AlertCertainty certaintyOf(const RegisteredClient& client) {
  switch (client.clientClass()) {
    case ClientClass::sandboxed: return client.isBeyondImitation() ? AlertCertainty::certain : AlertCertainty::likely;
    case ClientClass::unknownSandbox: return AlertCertainty::claimedInSandbox;
    case ClientClass::unit:
    case ClientClass::bare: break;
  }
  return AlertCertainty::claimed;
}

}  // namespace

AlertSubject subjectOf(const RegisteredClient& client) {
  return {.applicationName = client.localizedAppName(), .applicationID = client.id(), .certainty = certaintyOf(client)};
}

}  // namespace palisade
