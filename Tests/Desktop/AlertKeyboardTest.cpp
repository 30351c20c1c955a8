// What keys do to an alert's window, on a clock that the test turns: whole presses of fresh keys, and thousands of people who
// type while it comes.

#include "AlertHelper/AlertKeyboard.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <array>
#include <iostream>
#include <map>

#include "Tests/Host/Alert/RandomTyping.h"

namespace palisade {
namespace {

using std::chrono::milliseconds;
using testing::Optional;
using Key = AlertKeyboard::Key;

constexpr Key enter = 36;
constexpr Key tab = 23;
constexpr Key letter = 38;
constexpr Key shift = 50;

class AWindowsKeyboard : public testing::Test {
 protected:
  void appear(std::set<Key> held = {}) {
    _arming.setVisible(true);
    _arming.setFocused(true);
    _keyboard.windowCame(std::move(held));
  }
  void pass(int time) { _now += milliseconds(time); }
  std::optional<AlertWord> key(Key code, KeyMeaning meaning, int heldFor = 0) {
    _keyboard.wentDown(code, meaning);
    pass(heldFor);
    return _keyboard.wentUp(code);
  }
  std::optional<AlertWord> press(int heldFor = 0) { return key(enter, KeyMeaning::press, heldFor); }
  void stepForward(int times) {
    for (int count = 0; count < times; ++count) EXPECT_EQ(key(tab, KeyMeaning::forward), std::nullopt);
  }

  Arming::Moment _now{};
  Arming _arming{[this] { return _now; }};
  AlertFocus _focus{[this] { return _now; }};
  AlertKeyboard _keyboard{_arming, _focus};
};

TEST_F(AWindowsKeyboard, AnswersAtItsButtonsHalfASecondAfterItCameThere) {
  for (const auto& [steps, word] : {std::pair(2, AlertWord::refused), std::pair(3, AlertWord::allowed)}) {
    for (const int time : {0, 1, 250, 499, 500, 501, 5000}) {
      appear();
      stepForward(steps);
      pass(time);
      EXPECT_EQ(press(), time >= 500 ? std::optional(word) : std::nullopt) << time << " ms";
      _arming.setFocused(false);
      _keyboard.windowWent();
    }
  }
}

TEST_F(AWindowsKeyboard, AnswersNothingAtTheTextAndTheDetails) {
  appear();
  for (int steps = 0; steps < 2; ++steps) {
    pass(5000);
    EXPECT_EQ(press(), std::nullopt);
    pass(5000);
    stepForward(1);
  }
}

TEST_F(AWindowsKeyboard, TakesAPressThatLastsLong) {
  appear();
  stepForward(3);
  pass(500);
  EXPECT_THAT(press(3000), Optional(AlertWord::allowed));
}

TEST_F(AWindowsKeyboard, TakesNoneOfAStormOfPresses) {
  for (const int pause : {1, 3, 10, 33, 100, 250, 499}) {
    appear();
    stepForward(3);
    for (int time = 0; time <= 2000; time += pause) {
      EXPECT_EQ(press(), std::nullopt) << "every " << pause << " ms";
      pass(pause);
    }
    pass(500);
    EXPECT_THAT(press(), Optional(AlertWord::allowed));
    _arming.setFocused(false);
    _keyboard.windowWent();
  }
}

TEST_F(AWindowsKeyboard, TakesNoKeyThatRepeatsByItself) {
  appear();
  stepForward(3);
  pass(500);
  _keyboard.wentDown(enter, KeyMeaning::press);
  for (int count = 0; count < 60; ++count) {
    pass(33);
    _keyboard.wentDown(enter, KeyMeaning::press);
  }
  EXPECT_EQ(_keyboard.wentUp(enter), std::nullopt);
  EXPECT_EQ(_focus.place(), AlertPlace::text);
}

TEST_F(AWindowsKeyboard, DoesNotRunAlongWithATabThatIsHeld) {
  appear();
  _keyboard.wentDown(tab, KeyMeaning::forward);
  for (int count = 0; count < 60; ++count) {
    pass(33);
    _keyboard.wentDown(tab, KeyMeaning::forward);
    EXPECT_EQ(_focus.place(), AlertPlace::text);
  }
}

TEST_F(AWindowsKeyboard, TakesNoKeyThatWasDownBefore) {
  appear({enter});
  stepForward(3);
  pass(660);
  _keyboard.wentDown(enter, KeyMeaning::press);
  EXPECT_EQ(_keyboard.wentUp(enter), std::nullopt);
}

TEST_F(AWindowsKeyboard, TakesNoKeyThatOnlyGoesUp) {
  appear({enter});
  stepForward(3);
  pass(600);
  EXPECT_EQ(_keyboard.wentUp(enter), std::nullopt);
  EXPECT_THAT(press(), Optional(AlertWord::allowed)) << "it is fresh now";
}

TEST_F(AWindowsKeyboard, TakesNoPressDuringWhichAnotherKeyGoesDown) {
  appear();
  stepForward(3);
  pass(500);
  _keyboard.wentDown(enter, KeyMeaning::press);
  _keyboard.wentDown(letter, KeyMeaning::other);
  EXPECT_EQ(_keyboard.wentUp(enter), std::nullopt);
  EXPECT_EQ(_focus.place(), AlertPlace::text);
}

TEST_F(AWindowsKeyboard, PassesOverModifiers) {
  appear();
  stepForward(3);
  _keyboard.wentDown(shift, KeyMeaning::modifier);
  key(tab, KeyMeaning::back);
  EXPECT_EQ(_keyboard.wentUp(shift), std::nullopt);
  pass(500);
  EXPECT_THAT(press(), Optional(AlertWord::refused));
}

TEST_F(AWindowsKeyboard, TakesNoPressWhileTheAlertIsNotArmed) {
  appear();
  stepForward(3);
  pass(500);
  _arming.setCovered(true);
  EXPECT_EQ(press(), std::nullopt);
  _arming.setCovered(false);
  pass(499);
  EXPECT_EQ(press(), std::nullopt);
  pass(500);
  _keyboard.wentDown(enter, KeyMeaning::press);
  _arming.setCovered(true);
  EXPECT_EQ(_keyboard.wentUp(enter), std::nullopt) << "covered during the press";
}

TEST_F(AWindowsKeyboard, StartsAtTheTextWhenItsWindowWasLeft) {
  appear();
  stepForward(3);
  _arming.setFocused(false);
  _keyboard.windowWent();
  appear();
  pass(500);
  EXPECT_EQ(press(), std::nullopt);
}

TEST_F(AWindowsKeyboard, ClosesWithEscapeAtOnce) {
  appear();
  EXPECT_THAT(key(9, KeyMeaning::close), Optional(AlertWord::closed));
  appear({9});
  _keyboard.wentDown(9, KeyMeaning::close);
  EXPECT_EQ(_keyboard.wentUp(9), std::nullopt) << "a key that was down before";
}

// People who type.

struct KeyEvent {
  milliseconds at;
  bool isDown;
  Key key;
  KeyMeaning meaning;
};

constexpr Key alt = 1000;

KeyMeaning meaningOf(const TypedKey& key) {
  switch (key.kind) {
    case TypedKey::Kind::character:
      return key.character == ' ' || key.character == '\n' ? KeyMeaning::press : KeyMeaning::other;
    case TypedKey::Kind::forward: return KeyMeaning::forward;
    case TypedKey::Kind::back: return KeyMeaning::back;
    case TypedKey::Kind::left: return KeyMeaning::crossToRefuse;
    case TypedKey::Kind::right: return KeyMeaning::crossToAllow;
    case TypedKey::Kind::alt:
      if (key.character == 'a') return KeyMeaning::towardsAllow;
      return key.character == 'd' ? KeyMeaning::towardsRefuse : KeyMeaning::other;
    case TypedKey::Kind::up:
    case TypedKey::Kind::down: break;
  }
  return KeyMeaning::other;
}

// Fast hands press the next key before they let go of the last.
std::vector<KeyEvent> eventsOf(const Typing& typing) {
  std::vector<KeyEvent> events;
  milliseconds at{};
  for (std::size_t index = 0; index < typing.size(); ++index) {
    const TypedKey& typed = typing[index];
    at += typed.pause;
    const Key key = static_cast<Key>(typed.kind) * 256 + static_cast<unsigned char>(typed.character);
    const bool isRepeated =
        index + 1 < typing.size() && typing[index + 1].kind == typed.kind && typing[index + 1].character == typed.character;
    const milliseconds heldFor = isRepeated ? std::min(typed.heldFor, typing[index + 1].pause / 2) : typed.heldFor;
    if (typed.kind == TypedKey::Kind::alt) events.push_back({at, true, alt, KeyMeaning::modifier});
    events.push_back({at, true, key, meaningOf(typed)});
    events.push_back({at + heldFor, false, key, KeyMeaning::other});
    if (typed.kind == TypedKey::Kind::alt) events.push_back({at + heldFor, false, alt, KeyMeaning::other});
  }
  std::ranges::stable_sort(events, {}, &KeyEvent::at);
  return events;
}

std::optional<AlertWord> answerTo(const Typing& typing) {
  Arming::Moment now{};
  Arming arming([&] { return now; });
  AlertFocus focus([&] { return now; });
  AlertKeyboard keyboard(arming, focus);
  arming.setVisible(true);
  arming.setFocused(true);
  keyboard.windowCame({});
  for (const KeyEvent& event : eventsOf(typing)) {
    now = Arming::Moment(event.at);
    if (event.isDown) {
      keyboard.wentDown(event.key, event.meaning);
    } else if (const auto answer = keyboard.wentUp(event.key)) {
      return answer;
    }
  }
  return std::nullopt;
}

std::map<std::optional<AlertWord>, int> answersToTypings(bool withMoves) {
  constexpr std::uint32_t typings = 10'000;
  std::map<std::optional<AlertWord>, int> answers;
  for (std::uint32_t seed = 0; seed < typings; ++seed) ++answers[answerTo(randomTyping(seed, withMoves))];
  return answers;
}

TEST(TypingAtAWindow, AnswersNothing) {
  EXPECT_THAT(answersToTypings(false), testing::ElementsAre(testing::Pair(std::nullopt, 10'000)));
}

TEST(TypingAtAWindow, WithTabsArrowsAndAltAllowsNothing) {
  auto answers = answersToTypings(true);
  EXPECT_EQ(answers[AlertWord::allowed], 0);
  RecordProperty("refused", answers[AlertWord::refused]);
  std::cout << answers[AlertWord::refused] << " of 10,000 refused\n";
}

}  // namespace
}  // namespace palisade
