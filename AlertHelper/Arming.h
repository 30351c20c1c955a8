#pragma once

/// When a press of a button is meant: decides over clicks and keys before they may press anything.
///
/// The alert is armed when it has been visible, focused and uncovered for half a second in one piece. Whoever clicks or types
/// before that was doing something else; the wait starts again. A press counts only when it began and ended while the alert was
/// armed, and a key that was down before, or that repeats by itself, presses nothing until it has been let go.
/// Threads: one. Ownership: a value with a clock of the caller's. Errors: none; what is not understood presses nothing.

#include <chrono>
#include <functional>
#include <optional>
#include <set>

namespace palisade {

class Arming {
 public:
  using Moment = std::chrono::steady_clock::time_point;
  using Key = unsigned;

  explicit Arming(std::function<Moment()> now, std::chrono::milliseconds wait = std::chrono::milliseconds(500))
      : _now(std::move(now)),
        _wait(wait) {}

  void setVisible(bool isVisible) { setCondition(_isVisible, isVisible); }
  void setCovered(bool isCovered) { setCondition(_isUncovered, !isCovered); }

  /// `held` are the keys that are down at the moment in which the focus comes.
  void focusCame(std::set<Key> held);
  void focusWent();

  bool isArmed() const;

  /// What the end of a press is worth.
  enum class Press {
    none,   ///< not a press: the key was held, or never seen to go down
    early,  ///< a press, begun or ended before the alert was armed
    armed   ///< meant
  };

  /// False when the key was down already: it repeats by itself.
  bool keyWentDown(Key key);
  Press keyWentUp(Key key);

  void pointerWentDown();
  Press pointerWentUp();

  /// A press without a beginning and an end, such as an assistive technology's.
  Press pressedAtOnce();

 private:
  void setCondition(bool& condition, bool holds);
  void startWait();
  std::optional<unsigned> beginPress();
  Press endPress(std::optional<unsigned> begunIn) const;

  std::function<Moment()> _now;
  std::chrono::milliseconds _wait;
  bool _isVisible = false;
  bool _isFocused = false;
  bool _isUncovered = true;
  Moment _waitingSince{};
  /// Counts the waits: a press that began in an earlier one is early.
  unsigned _waits = 0;
  std::set<Key> _held;
  std::optional<Key> _pressedKey;
  std::optional<unsigned> _keyBegunIn;
  std::optional<unsigned> _pointerBegunIn;
};

}  // namespace palisade
