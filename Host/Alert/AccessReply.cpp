#include "Host/Alert/AccessReply.h"

namespace palisade {

AlertResponse responseOfReply(const std::optional<AccessReply>& reply) {
  constexpr std::uint32_t granted = 0;
  const bool isConsent = reply && reply->response == granted && reply->after >= soonestConsent;
  return isConsent ? AlertResponseDefaultButton : AlertResponseNobody;
}

}  // namespace palisade
