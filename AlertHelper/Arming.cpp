#include "AlertHelper/Arming.h"

#include <utility>

namespace palisade {

bool Arming::isArmed() const { return _isVisible && _isFocused && _isUncovered && _now() - _waitingSince >= _wait; }

Arming::Beginning Arming::beginPress() {
  if (isArmed()) return _waits;
  startWait();
  return std::nullopt;
}

Arming::Press Arming::endPress(Beginning beginning) const {
  return beginning == _waits && isArmed() ? Press::armed : Press::early;
}

Arming::Press Arming::pointerWentUp() { return endPress(std::exchange(_pointerBegan, std::nullopt)); }
Arming::Press Arming::pressedAtOnce() { return endPress(beginPress()); }

void Arming::setCondition(bool& condition, bool holds) {
  if (condition == holds) return;
  condition = holds;
  startWait();
}

void Arming::startWait() {
  _waitingSince = _now();
  ++_waits;
}

}  // namespace palisade
