#pragma once

/// Where the keyboard stands in an alert, and which button a key may press.
///
/// An alert comes while people type, so typing neither allows nor refuses: the keyboard starts at the text, and every key that
/// is not meant for the alert takes it back there. It moves one step at a time, from the text to the details, to Don't Allow
/// and to Allow, so that no single key leads to Allow. Return and Space press a button half a second after the keyboard came to
/// it. Tabs and arrows belong to what people write, too: for three seconds after any other key they move nothing. Threads: one.
/// Ownership: a value with a clock of the caller's. Errors: none; what is not understood presses nothing.

#include <chrono>
#include <functional>
#include <optional>

namespace palisade {

/// In the order in which the keyboard passes them.
enum class AlertPlace { text, details, refuse, allow };

class AlertFocus {
 public:
  using Moment = std::chrono::steady_clock::time_point;

  struct Timing {
    /// How long the keyboard has to stand on a button before a key presses it.
    std::chrono::microseconds wait = std::chrono::milliseconds(500);
    /// How long nothing may have been typed before a key moves the keyboard.
    std::chrono::microseconds quiet = std::chrono::seconds(3);
  };

  explicit AlertFocus(std::function<Moment()> now) : AlertFocus(std::move(now), Timing{}) {}
  AlertFocus(std::function<Moment()> now, Timing timing);

  /// Passes the details over: there are none.
  void leaveOutDetails() { _hasDetails = false; }

  AlertPlace place() const { return _place; }

  /// One step on; after Allow comes the text again.
  void stepForward();
  /// One step back; the text is the last.
  void stepBack();
  /// One step towards that button, from any place.
  void stepTowards(AlertPlace button);
  /// From the other button to that one. From elsewhere it is a key like any other.
  void crossTo(AlertPlace button);

  /// A key that means nothing to the alert.
  void typed();

  /// Return or Space: the button that it presses. None when the keyboard stands on none, or has not stood there for long
  /// enough: the wait then begins anew.
  std::optional<AlertPlace> press();

  /// Puts the keyboard there without a key, as assistive technology does.
  void putOn(AlertPlace place);

 private:
  bool isOnButton() const { return _place == AlertPlace::refuse || _place == AlertPlace::allow; }
  bool isTyping() const;
  AlertPlace next() const;
  AlertPlace previous() const;
  void moveTo(AlertPlace place);

  std::function<Moment()> _now;
  Timing _timing;
  bool _hasDetails = true;
  AlertPlace _place = AlertPlace::text;
  Moment _cameAt;
  bool _wasPressedTooSoon = false;
  std::optional<Moment> _typedAt;
};

}  // namespace palisade
