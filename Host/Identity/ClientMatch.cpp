#include "Host/Identity/ClientMatch.h"

namespace palisade {

ClientClass ClientMatch::weakestClass() const {
  if (isRecognisedByExecutable()) return ClientClass::bare;
  return unit ? ClientClass::unit : ClientClass::sandboxed;
}

std::optional<std::string> sharedMatch(const ClientMatch& one, const ClientMatch& other) {
  if (one.flatpak && one.flatpak == other.flatpak) return "the Flatpak application '" + *one.flatpak + "'";
  if (one.snap && one.snap == other.snap) return "the snap '" + *one.snap + "'";
  const bool isOneProgram = !one.executable || !other.executable || *one.executable == *other.executable;
  if (one.unit && one.unit == other.unit && isOneProgram) return "the unit '" + *one.unit + "'";
  if (one.isRecognisedByExecutable() && other.isRecognisedByExecutable() && *one.executable == *other.executable) {
    return "the executable " + one.executable->string();
  }
  return std::nullopt;
}

}  // namespace palisade
