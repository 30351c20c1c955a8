#include "Host/Alert/HelperEnding.h"

namespace palisade {

AlertResponse responseOfEnding(std::string_view received, std::optional<int> waitStatus, const AlertNonce& nonce) {
  constexpr int exitedCleanly = 0;
  if (waitStatus != exitedCleanly) return AlertResponseNobody;
  const auto word = wordOfAlertAnswer(received, nonce);
  if (word == AlertWord::refused) return AlertResponseAlternateButton;
  if (word == AlertWord::allowed) return AlertResponseDefaultButton;
  return AlertResponseNobody;
}

}  // namespace palisade
