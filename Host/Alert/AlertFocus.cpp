#include "Host/Alert/AlertFocus.h"

#include <utility>

namespace palisade {

AlertFocus::AlertFocus(std::function<Moment()> now, Timing timing) : _now(std::move(now)), _timing(timing), _cameAt(_now()) {}

void AlertFocus::stepForward() { moveTo(next()); }
void AlertFocus::stepBack() { moveTo(previous()); }

void AlertFocus::stepTowards(AlertPlace button) {
  if (_place == button) {
    moveTo(button);
  } else {
    moveTo(_place < button ? next() : previous());
  }
}

void AlertFocus::crossTo(AlertPlace button) {
  if (isOnButton()) {
    moveTo(button);
  } else {
    typed();
  }
}

void AlertFocus::typed() {
  _typedAt = _now();
  putOn(AlertPlace::text);
}

std::optional<AlertPlace> AlertFocus::press() {
  if (!isOnButton()) {
    typed();
    return std::nullopt;
  }
  if (_now() - _cameAt >= _timing.wait) return _place;
  _cameAt = _now();
  _wasPressedTooSoon = true;
  return std::nullopt;
}

void AlertFocus::putOn(AlertPlace place) {
  _place = place;
  _cameAt = _now();
  _wasPressedTooSoon = false;
}

bool AlertFocus::isTyping() const { return _typedAt && _now() - *_typedAt < _timing.quiet; }

AlertPlace AlertFocus::next() const {
  switch (_place) {
    case AlertPlace::text: return _hasDetails ? AlertPlace::details : AlertPlace::refuse;
    case AlertPlace::details: return AlertPlace::refuse;
    case AlertPlace::refuse: return AlertPlace::allow;
    case AlertPlace::allow: break;
  }
  return AlertPlace::text;
}

AlertPlace AlertFocus::previous() const {
  switch (_place) {
    case AlertPlace::allow: return AlertPlace::refuse;
    case AlertPlace::refuse: return _hasDetails ? AlertPlace::details : AlertPlace::text;
    case AlertPlace::details:
    case AlertPlace::text: break;
  }
  return AlertPlace::text;
}

// A step that comes soon after typing is part of what is typed, and so is one after a press that came too soon.
void AlertFocus::moveTo(AlertPlace place) { putOn(isTyping() || _wasPressedTooSoon ? AlertPlace::text : place); }

}  // namespace palisade
