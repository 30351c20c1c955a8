#include "Host/Daemon/AlertCoolDown.h"

#include <algorithm>

namespace palisade {

std::optional<AlertCoolDown::Clock::duration> AlertCoolDown::remainingFor(const std::string& application) {
  const std::lock_guard lock(_mutex);
  const auto counts = _counts.find(application);
  if (counts == _counts.end()) return std::nullopt;
  const Clock::duration remaining = counts->second.coolUntil - _now();
  return remaining > Clock::duration::zero() ? std::optional(remaining) : std::nullopt;
}

std::optional<BusFailure> AlertCoolDown::refusalFor(const std::string& application) {
  const auto remaining = remainingFor(application);
  if (!remaining) return std::nullopt;
  const auto minutes = std::chrono::ceil<std::chrono::minutes>(*remaining).count();
  return BusFailure(
      BusFailureKind::notAsked,
      "The user has turned this application's requests down again and again and is not asked about it for now. Ask again in " +
          std::to_string(minutes) + (minutes == 1 ? " minute." : " minutes."));
}

bool AlertCoolDown::note(const std::string& application, AlertEnding ending) {
  if (_limits.refusals == 0) return false;
  const std::lock_guard lock(_mutex);
  if (ending == AlertEnding::allowed) {
    _counts.erase(application);
    return false;
  }
  Counts& counts = countsOf(application);
  counts.lastNoted = _now();
  if (ending == AlertEnding::refused) {
    ++counts.refusals;
    counts.unanswered = 0;
  } else {
    ++counts.unanswered;
  }
  const bool isTooMuch =
      ending == AlertEnding::refused ? counts.refusals >= _limits.refusals : counts.unanswered >= mostUnanswered;
  if (isTooMuch) counts.coolUntil = counts.lastNoted + _limits.length;
  return isTooMuch;
}

AlertCoolDown::Counts& AlertCoolDown::countsOf(const std::string& application) {
  if (!_counts.contains(application) && _counts.size() >= mostApplications) {
    _counts.erase(std::ranges::min_element(_counts, {}, [](const auto& entry) { return entry.second.lastNoted; }));
  }
  return _counts[application];
}

}  // namespace palisade
