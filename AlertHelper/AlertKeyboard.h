#pragma once

/// What the keys say to an alert's window, from the moment they go down to the moment they go up.
///
/// `AlertFocus` says where the keyboard stands and what a key may press there; here a press is also one whole press of a fresh
/// key: nothing else goes down between its beginning and its end, the alert is armed at both, and a key that was down before
/// the alert came, or that repeats by itself, is typing. Threads: one. Ownership: borrows the two that decide with it.
/// Errors: none; what is not understood presses nothing.

#include <optional>
#include <set>

#include "AlertHelper/Arming.h"
#include "Host/Alert/AlertAnswer.h"
#include "Host/Alert/AlertFocus.h"

namespace palisade {

/// What a key asks for, with the modifiers that are down beside it.
enum class KeyMeaning {
  modifier,       ///< Shift, Alt and their like, which mean nothing alone
  forward,        ///< Tab
  back,           ///< Shift and Tab
  towardsRefuse,  ///< Alt and the letter of Don't Allow
  towardsAllow,   ///< Alt and the letter of Allow
  crossToRefuse,  ///< the arrow that points to Don't Allow
  crossToAllow,   ///< the arrow that points to Allow
  press,          ///< Return, Space
  close,          ///< Escape
  other
};

class AlertKeyboard {
 public:
  using Key = unsigned;

  AlertKeyboard(Arming& arming, AlertFocus& focus) : _arming(arming), _focus(focus) {}

  /// `held` are the keys that are down at the moment in which the window comes to the keyboard.
  void windowCame(std::set<Key> held);
  void windowWent();

  void wentDown(Key key, KeyMeaning meaning);

  /// The answer that the end of this press gives, if it gives one.
  std::optional<AlertWord> wentUp(Key key);

 private:
  struct Pressed {
    Key key;
    AlertWord word;
    Arming::Beginning beginning;
  };

  void heed(Key key, KeyMeaning meaning);

  Arming& _arming;
  AlertFocus& _focus;
  std::set<Key> _held;
  std::optional<Pressed> _pressed;
};

}  // namespace palisade
