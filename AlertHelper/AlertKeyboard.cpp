#include "AlertHelper/AlertKeyboard.h"

#include <utility>

namespace palisade {

void AlertKeyboard::windowCame(std::set<Key> held) { _held = std::move(held); }

// Keys that go up elsewhere are not heard of any more. Who comes back starts at the text.
void AlertKeyboard::windowWent() {
  _held.clear();
  _pressed.reset();
  _focus.putOn(AlertPlace::text);
}

void AlertKeyboard::wentDown(Key key, KeyMeaning meaning) {
  const bool isFresh = _held.insert(key).second;
  if (meaning == KeyMeaning::modifier) return;
  _pressed.reset();
  if (isFresh) {
    heed(key, meaning);
  } else {
    _arming.beginPress();
    _focus.typed();
  }
}

void AlertKeyboard::heed(Key key, KeyMeaning meaning) {
  const Arming::Beginning beginning = _arming.beginPress();
  switch (meaning) {
    case KeyMeaning::modifier: break;
    case KeyMeaning::forward: _focus.stepForward(); break;
    case KeyMeaning::back: _focus.stepBack(); break;
    case KeyMeaning::towardsRefuse: _focus.stepTowards(AlertPlace::refuse); break;
    case KeyMeaning::towardsAllow: _focus.stepTowards(AlertPlace::allow); break;
    case KeyMeaning::crossToRefuse: _focus.crossTo(AlertPlace::refuse); break;
    case KeyMeaning::crossToAllow: _focus.crossTo(AlertPlace::allow); break;
    case KeyMeaning::press:
      if (const auto button = _focus.press()) {
        _pressed = Pressed{
            .key = key, .word = *button == AlertPlace::allow ? AlertWord::allowed : AlertWord::refused, .beginning = beginning};
      }
      break;
    case KeyMeaning::close: _pressed = Pressed{.key = key, .word = AlertWord::closed, .beginning = {}}; break;
    case KeyMeaning::other: _focus.typed(); break;
  }
}

std::optional<AlertWord> AlertKeyboard::wentUp(Key key) {
  _held.erase(key);
  if (!_pressed || _pressed->key != key) return std::nullopt;
  const Pressed pressed = *std::exchange(_pressed, std::nullopt);
  // Closing decides nothing, so it needs no wait.
  if (pressed.word == AlertWord::closed) return pressed.word;
  return _arming.endPress(pressed.beginning) == Arming::Press::armed ? std::optional(pressed.word) : std::nullopt;
}

}  // namespace palisade
