// Where the keyboard stands: one step at a time, back to the text with every other key, and a wait on each button.

#include "Host/Alert/AlertFocus.h"

#include <gmock/gmock.h>

namespace palisade {
namespace {

using std::chrono::milliseconds;
using testing::Optional;

class AnAlertsKeyboard : public testing::Test {
 protected:
  void pass(int time) { _now += milliseconds(time); }
  void stepForward(int times) {
    for (int count = 0; count < times; ++count) _focus.stepForward();
  }

  AlertFocus::Moment _now{};
  AlertFocus _focus{[this] { return _now; }};
};

TEST_F(AnAlertsKeyboard, StandsAtTheTextAtFirst) {
  EXPECT_EQ(_focus.place(), AlertPlace::text);
  pass(60'000);
  EXPECT_EQ(_focus.press(), std::nullopt);
}

TEST_F(AnAlertsKeyboard, GoesFromTheTextToTheDetailsAndTheButtonsAndAround) {
  for (const AlertPlace place : {AlertPlace::details, AlertPlace::refuse, AlertPlace::allow, AlertPlace::text}) {
    _focus.stepForward();
    EXPECT_EQ(_focus.place(), place);
  }
}

TEST_F(AnAlertsKeyboard, GoesBackToTheTextAndNoFurther) {
  stepForward(3);
  for (const AlertPlace place : {AlertPlace::refuse, AlertPlace::details, AlertPlace::text, AlertPlace::text}) {
    _focus.stepBack();
    EXPECT_EQ(_focus.place(), place);
  }
}

TEST_F(AnAlertsKeyboard, PassesOverDetailsThatThereAreNot) {
  _focus.leaveOutDetails();
  _focus.stepForward();
  EXPECT_EQ(_focus.place(), AlertPlace::refuse);
  _focus.stepBack();
  EXPECT_EQ(_focus.place(), AlertPlace::text);
}

TEST_F(AnAlertsKeyboard, GoesOneStepTowardsAButton) {
  for (const AlertPlace place : {AlertPlace::details, AlertPlace::refuse, AlertPlace::allow, AlertPlace::allow}) {
    _focus.stepTowards(AlertPlace::allow);
    EXPECT_EQ(_focus.place(), place);
  }
  for (int count = 0; count < 2; ++count) {
    _focus.stepTowards(AlertPlace::refuse);
    EXPECT_EQ(_focus.place(), AlertPlace::refuse);
  }
}

TEST_F(AnAlertsKeyboard, CrossesFromButtonToButtonAlone) {
  _focus.crossTo(AlertPlace::allow);
  EXPECT_EQ(_focus.place(), AlertPlace::text);
  pass(3000);
  stepForward(2);
  _focus.crossTo(AlertPlace::allow);
  EXPECT_EQ(_focus.place(), AlertPlace::allow);
  _focus.crossTo(AlertPlace::refuse);
  EXPECT_EQ(_focus.place(), AlertPlace::refuse);
}

TEST_F(AnAlertsKeyboard, PressesAButtonHalfASecondAfterItCameThere) {
  for (const auto& [steps, button] : {std::pair(2, AlertPlace::refuse), std::pair(3, AlertPlace::allow)}) {
    _focus.putOn(AlertPlace::text);
    pass(60'000);
    stepForward(steps);
    pass(499);
    EXPECT_EQ(_focus.press(), std::nullopt);
    EXPECT_EQ(_focus.place(), button) << "whoever was too fast need not begin again";
    pass(499);
    EXPECT_EQ(_focus.press(), std::nullopt) << "the wait began again";
    pass(500);
    EXPECT_THAT(_focus.press(), Optional(button));
  }
}

TEST_F(AnAlertsKeyboard, DoesNotGoOnFromAButtonThatWasPressedTooSoon) {
  stepForward(2);
  EXPECT_EQ(_focus.press(), std::nullopt);
  _focus.stepForward();
  EXPECT_EQ(_focus.place(), AlertPlace::text);
  stepForward(3);
  pass(500);
  EXPECT_THAT(_focus.press(), Optional(AlertPlace::allow));
}

TEST_F(AnAlertsKeyboard, WaitsAnewAfterEveryMove) {
  stepForward(3);
  pass(499);
  _focus.stepBack();
  pass(1);
  EXPECT_EQ(_focus.press(), std::nullopt);
  pass(499);
  _focus.stepTowards(AlertPlace::refuse);
  pass(499);
  EXPECT_EQ(_focus.press(), std::nullopt) << "a move that stays where it is";
}

TEST_F(AnAlertsKeyboard, GoesBackToTheTextWithEveryOtherKey) {
  stepForward(3);
  pass(500);
  _focus.typed();
  EXPECT_EQ(_focus.place(), AlertPlace::text);
  pass(500);
  EXPECT_EQ(_focus.press(), std::nullopt);
}

TEST_F(AnAlertsKeyboard, DoesNotMoveForThreeSecondsAfterTyping) {
  _focus.typed();
  for (int time = 0; time < 3000; time += 100) {
    _focus.stepForward();
    EXPECT_EQ(_focus.place(), AlertPlace::text) << time << " ms";
    pass(100);
  }
  _focus.stepForward();
  EXPECT_EQ(_focus.place(), AlertPlace::details) << "steps that come too soon lengthen nothing";
}

TEST_F(AnAlertsKeyboard, TakesReturnAtTheTextForTyping) {
  EXPECT_EQ(_focus.press(), std::nullopt);
  _focus.stepForward();
  EXPECT_EQ(_focus.place(), AlertPlace::text);
}

}  // namespace
}  // namespace palisade
