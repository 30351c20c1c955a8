// When a press is meant, on a clock that the test turns: a table of early and late presses, and storms of clicks.

#include "AlertHelper/Arming.h"

#include <gmock/gmock.h>

namespace palisade {
namespace {

using std::chrono::milliseconds;
using Press = Arming::Press;

class AnAlertThatArms : public testing::Test {
 protected:
  void appear() {
    _arming.setVisible(true);
    _arming.setFocused(true);
  }
  void pass(int time) { _now += milliseconds(time); }
  Press click(int heldFor = 0) {
    _arming.pointerWentDown();
    pass(heldFor);
    return _arming.pointerWentUp();
  }

  Arming::Moment _now{};
  Arming _arming{[this] { return _now; }};
};

TEST_F(AnAlertThatArms, TakesOnePressAtAnyTimeOnlyFromHalfASecondOn) {
  for (int time = 0; time <= 2000; ++time) {
    Arming::Moment now{};
    Arming arming([&now] { return now; });
    arming.setVisible(true);
    arming.setFocused(true);
    now += milliseconds(time);
    arming.pointerWentDown();
    ASSERT_EQ(arming.pointerWentUp(), time >= 500 ? Press::armed : Press::early) << time << " ms";
  }
}

TEST_F(AnAlertThatArms, TakesNoneOfAStormOfPresses) {
  for (const int pause : {1, 3, 10, 33, 100, 250, 499}) {
    appear();
    for (int time = 0; time <= 2000; time += pause) {
      EXPECT_EQ(click(), Press::early) << "every " << pause << " ms";
      EXPECT_EQ(_arming.pressedAtOnce(), Press::early) << "every " << pause << " ms";
      pass(pause);
    }
    pass(500);
    EXPECT_EQ(click(), Press::armed);
    _arming.setFocused(false);
  }
}

TEST_F(AnAlertThatArms, TakesNoPressThatBeganBefore) {
  appear();
  EXPECT_EQ(click(600), Press::early);
}

TEST_F(AnAlertThatArms, TakesAPressThatLastsLong) {
  appear();
  pass(500);
  EXPECT_EQ(click(3000), Press::armed);
}

TEST_F(AnAlertThatArms, TakesNoPressThatOnlyEnds) {
  appear();
  pass(600);
  EXPECT_EQ(_arming.pointerWentUp(), Press::early);
}

TEST_F(AnAlertThatArms, WaitsAgainWhenItWasHiddenCoveredOrLeft) {
  const std::vector<std::pair<const char*, std::function<void()>>> disturbances = {{"hidden",
                                                                                    [&] {
                                                                                      _arming.setVisible(false);
                                                                                      _arming.setVisible(true);
                                                                                    }},
                                                                                   {"covered",
                                                                                    [&] {
                                                                                      _arming.setCovered(true);
                                                                                      _arming.setCovered(false);
                                                                                    }},
                                                                                   {"left", [&] {
                                                                                      _arming.setFocused(false);
                                                                                      _arming.setFocused(true);
                                                                                    }}};
  appear();
  for (const auto& [name, disturb] : disturbances) {
    pass(500);
    EXPECT_TRUE(_arming.isArmed()) << name;
    _arming.pointerWentDown();
    disturb();
    EXPECT_FALSE(_arming.isArmed()) << name;
    pass(499);
    EXPECT_FALSE(_arming.isArmed()) << name;
    pass(1);
    EXPECT_TRUE(_arming.isArmed()) << name;
    EXPECT_EQ(_arming.pointerWentUp(), Press::early) << name << " during the press";
  }
}

TEST_F(AnAlertThatArms, StaysUnarmedAsLongAsAnythingIsMissing) {
  _arming.setVisible(true);
  pass(5000);
  EXPECT_EQ(click(), Press::early) << "never focused";
  _arming.setFocused(true);
  _arming.setCovered(true);
  pass(5000);
  EXPECT_EQ(click(), Press::early) << "covered";
  _arming.setCovered(false);
  _arming.setVisible(false);
  pass(5000);
  EXPECT_EQ(_arming.pressedAtOnce(), Press::early) << "hidden";
}

TEST_F(AnAlertThatArms, IsNotDisturbedByHearingTheSameTwice) {
  appear();
  pass(500);
  _arming.setVisible(true);
  _arming.setCovered(false);
  EXPECT_EQ(_arming.pressedAtOnce(), Press::armed);
}

}  // namespace
}  // namespace palisade
