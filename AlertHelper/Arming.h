#pragma once

/// When a press of a button is meant: decides over clicks, and over the beginning and the end of every other press.
///
/// The alert is armed when it has been visible, focused and uncovered for half a second in one piece. Whoever clicks or types
/// before that was doing something else; the wait starts again. A press counts only when it began and ended while the alert was
/// armed. What the keyboard may press is `AlertKeyboard`'s to say.
/// Threads: one. Ownership: a value with a clock of the caller's. Errors: none; what is not understood presses nothing.

#include <chrono>
#include <functional>
#include <optional>

namespace palisade {

class Arming {
 public:
  using Moment = std::chrono::steady_clock::time_point;

  explicit Arming(std::function<Moment()> now, std::chrono::milliseconds wait = std::chrono::milliseconds(500))
      : _now(std::move(now)),
        _wait(wait) {}

  void setVisible(bool isVisible) { setCondition(_isVisible, isVisible); }
  void setFocused(bool isFocused) { setCondition(_isFocused, isFocused); }
  void setCovered(bool isCovered) { setCondition(_isUncovered, !isCovered); }

  bool isArmed() const;

  /// What the end of a press is worth.
  enum class Press {
    early,  ///< begun or ended before the alert was armed
    armed   ///< meant
  };

  /// The wait in which a press begins; none when it is too early.
  using Beginning = std::optional<unsigned>;
  Beginning beginPress();
  Press endPress(Beginning beginning) const;

  void pointerWentDown() { _pointerBegan = beginPress(); }
  Press pointerWentUp();

  /// A press without a beginning and an end, such as an assistive technology's.
  Press pressedAtOnce();

 private:
  void setCondition(bool& condition, bool holds);
  void startWait();

  std::function<Moment()> _now;
  std::chrono::milliseconds _wait;
  bool _isVisible = false;
  bool _isFocused = false;
  bool _isUncovered = true;
  Moment _waitingSince{};
  /// Counts the waits: a press that began in an earlier one is early.
  unsigned _waits = 0;
  Beginning _pointerBegan;
};

}  // namespace palisade
