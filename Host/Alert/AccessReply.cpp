#include "Host/Alert/AccessReply.h"

namespace palisade {

AlertResponse responseOfReply(const std::optional<AccessReply>& reply) {
  constexpr std::uint32_t granted = 0;
  constexpr std::uint32_t denied = 1;
  if (!reply) return AlertResponseNobody;
  if (reply->response == denied) return AlertResponseAlternateButton;
  if (reply->response == granted && reply->after >= soonestConsent) return AlertResponseDefaultButton;
  return AlertResponseNobody;
}

}  // namespace palisade
