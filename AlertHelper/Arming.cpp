#include "AlertHelper/Arming.h"

#include <utility>

namespace palisade {

void Arming::focusCame(std::set<Key> held) {
  _held = std::move(held);
  setCondition(_isFocused, true);
}

// Keys that go up elsewhere are not heard of any more.
void Arming::focusWent() {
  _held.clear();
  _pressedKey.reset();
  setCondition(_isFocused, false);
}

bool Arming::isArmed() const { return _isVisible && _isFocused && _isUncovered && _now() - _waitingSince >= _wait; }

bool Arming::keyWentDown(Key key) {
  const bool isFresh = _held.insert(key).second;
  if (!isFresh) {
    _pressedKey.reset();
    startWait();
    return false;
  }
  _pressedKey = key;
  _keyBegunIn = beginPress();
  return true;
}

Arming::Press Arming::keyWentUp(Key key) {
  _held.erase(key);
  if (_pressedKey != key) return Press::none;
  _pressedKey.reset();
  return endPress(_keyBegunIn);
}

void Arming::pointerWentDown() { _pointerBegunIn = beginPress(); }
Arming::Press Arming::pointerWentUp() { return endPress(std::exchange(_pointerBegunIn, std::nullopt)); }
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

// None when it is too early.
std::optional<unsigned> Arming::beginPress() {
  if (isArmed()) return _waits;
  startWait();
  return std::nullopt;
}

Arming::Press Arming::endPress(std::optional<unsigned> begunIn) const {
  return begunIn == _waits && isArmed() ? Press::armed : Press::early;
}

}  // namespace palisade
