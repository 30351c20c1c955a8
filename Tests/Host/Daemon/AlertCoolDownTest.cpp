#include "Host/Daemon/AlertCoolDown.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <optional>
#include <ostream>
#include <string>
#include <string_view>
#include <thread>
#include <vector>

namespace palisade {
namespace {

using std::chrono::minutes;
using std::chrono::nanoseconds;
using testing::Eq;
using testing::Optional;

// Time passes when a test says so.
class CoolDown : public testing::Test {
 protected:
  AlertCoolDown made(AlertCoolDown::Limits limits = {}) {
    return AlertCoolDown(limits, [this] { return now; });
  }
  AlertCoolDown::Clock::time_point now{std::chrono::hours(1)};
};

struct Story {
  const char* description;
  /// What happens in turn: (a)llowed, (r)efused, (u)nanswered; a digit is that many minutes, "h" an hour.
  std::string_view events;
  /// The minutes that the application cools down yet.
  std::optional<minutes> remaining;
};

std::ostream& operator<<(std::ostream& stream, const Story& story) { return stream << story.events; }

class AnApplicationsAlerts : public CoolDown, public testing::WithParamInterface<Story> {};

TEST_P(AnApplicationsAlerts, AreShownOrNotByWhatBecameOfTheEarlierOnes) {
  AlertCoolDown coolDown = made({.refusals = 3, .length = minutes(60)});
  for (const char event : GetParam().events) {
    switch (event) {
      case 'a': coolDown.note("photos", AlertEnding::allowed); break;
      case 'r': coolDown.note("photos", AlertEnding::refused); break;
      case 'u': coolDown.note("photos", AlertEnding::unanswered); break;
      case 'h': now += minutes(60); break;
      default: now += minutes(event - '0');
    }
  }
  EXPECT_EQ(coolDown.remainingFor("photos"), GetParam().remaining);
}

INSTANTIATE_TEST_SUITE_P(
    Of, AnApplicationsAlerts,
    testing::Values(Story{"ANewApplication", "", std::nullopt}, Story{"TwoRefusals", "rr", std::nullopt},
                    Story{"ThreeRefusals", "rrr", minutes(60)}, Story{"ThreeRefusalsApart", "r9rhh9r", minutes(60)},
                    Story{"ThreeRefusalsAWhileAgo", "rrr9", minutes(51)}, Story{"ACoolDownThatIsOver", "rrrh", std::nullopt},
                    Story{"OneMoreRefusalAfterIt", "rrrh5r", minutes(60)}, Story{"AnApprovalAfterIt", "rrrharr", std::nullopt},
                    Story{"AnApprovalDuringIt", "rrra", std::nullopt}, Story{"RefusalsAroundAnApproval", "rrarr", std::nullopt},
                    Story{"ThreeRefusalsAfterAnApproval", "rrarrr", minutes(60)},
                    Story{"NineWithoutAnAnswer", "uuuuuuuuu", std::nullopt},
                    Story{"TenWithoutAnAnswer", "uuuuuuuuuu", minutes(60)},
                    Story{"OneMoreWithoutAnAnswerAfterThat", "uuuuuuuuuuhu", minutes(60)},
                    Story{"ARefusalAmongThoseWithoutAnAnswer", "uuuuuuuuurruuuuuuuuu", std::nullopt},
                    Story{"AnApprovalAmongThoseWithoutAnAnswer", "uuuuuuuuuau", std::nullopt},
                    Story{"ThreeRefusalsAmongThoseWithoutAnAnswer", "ruruur", minutes(60)}),
    [](const auto& story) { return story.param.description; });

TEST_F(CoolDown, BeginsWhenItSaysSo) {
  AlertCoolDown coolDown = made({.refusals = 2});
  EXPECT_FALSE(coolDown.note("photos", AlertEnding::refused));
  EXPECT_TRUE(coolDown.note("photos", AlertEnding::refused));
  EXPECT_FALSE(coolDown.note("photos", AlertEnding::allowed));
}

TEST_F(CoolDown, LastsAsLongAsItIsTo) {
  AlertCoolDown coolDown = made({.refusals = 1, .length = minutes(5)});
  coolDown.note("photos", AlertEnding::refused);
  now += minutes(5) - nanoseconds(1);
  EXPECT_THAT(coolDown.remainingFor("photos"), Optional(Eq(nanoseconds(1))));
  now += nanoseconds(1);
  EXPECT_EQ(coolDown.remainingFor("photos"), std::nullopt);
}

TEST_F(CoolDown, IsOneApplicationsAlone) {
  AlertCoolDown coolDown = made({.refusals = 2});
  for (const char* application : {"photos", "music", "photos"}) coolDown.note(application, AlertEnding::refused);
  EXPECT_NE(coolDown.remainingFor("photos"), std::nullopt);
  EXPECT_EQ(coolDown.remainingFor("music"), std::nullopt);
}

TEST_F(CoolDown, NeverBeginsWhenItIsSwitchedOff) {
  AlertCoolDown coolDown = made({.refusals = 0});
  for (int time = 0; time < 100; ++time) {
    EXPECT_FALSE(coolDown.note("photos", AlertEnding::refused));
    EXPECT_FALSE(coolDown.note("photos", AlertEnding::unanswered));
  }
  EXPECT_EQ(coolDown.remainingFor("photos"), std::nullopt);
}

TEST_F(CoolDown, ForgetsWhomItHeardOfLongestAgoWhenThereAreTooMany) {
  AlertCoolDown coolDown = made({.refusals = 1});
  coolDown.note("first", AlertEnding::refused);
  now += nanoseconds(1);
  coolDown.note("second", AlertEnding::refused);
  for (std::size_t number = 1; number < AlertCoolDown::mostApplications; ++number) {
    now += nanoseconds(1);
    coolDown.note(std::to_string(number), AlertEnding::refused);
  }
  EXPECT_EQ(coolDown.remainingFor("first"), std::nullopt);
  EXPECT_NE(coolDown.remainingFor("second"), std::nullopt);
}

TEST_F(CoolDown, CountsWhatSeveralThreadsNote) {
  AlertCoolDown coolDown = made({.refusals = 401});
  {
    std::vector<std::jthread> threads;
    for (int thread = 0; thread < 4; ++thread) {
      threads.emplace_back([&] {
        for (int time = 0; time < 100; ++time) EXPECT_FALSE(coolDown.note("photos", AlertEnding::refused));
      });
    }
  }
  EXPECT_TRUE(coolDown.note("photos", AlertEnding::refused));
}

}  // namespace
}  // namespace palisade
