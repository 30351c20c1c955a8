#pragma once

/// Keeps an application from asking the user again and again what the user does not want to be asked.
///
/// An application whose alerts were refused a few times, with no approval between, cools down: until that time is over none of
/// its alerts may be shown. So it does after many alerts in a row that ended without an answer: nobody has decided anything
/// then, yet each of them took the keyboard, or kept keychain and server busy with a question that the user never came to see.
/// The counts stand until an approval, so after a cool-down the next refusal begins another one. What is counted lives as long
/// as the daemon. Threads: safe from every thread. Time is a steady clock's: setting the date neither ends nor lengthens a
/// cool-down. Ownership: a value that owns its counts, of a bounded number of applications; the one that was heard of longest
/// ago is forgotten first. Errors: none.

#include <chrono>
#include <cstddef>
#include <functional>
#include <map>
#include <mutex>
#include <optional>
#include <string>

#include "Host/Bus/AccountsService.h"

namespace palisade {

/// How an alert came to its end.
enum class AlertEnding {
  allowed,
  refused,
  unanswered  ///< closed, taken down, or gone with its application; or it never stood, for want of an answer of the server's
};

class AlertCoolDown {
 public:
  using Clock = std::chrono::steady_clock;

  struct Limits {
    /// How many refusals begin a cool-down; 0 never begins one.
    unsigned refusals = 3;
    std::chrono::minutes length{60};
  };

  /// So many alerts in a row without an answer begin a cool-down too.
  static constexpr unsigned mostUnanswered = 10;
  static constexpr std::size_t mostApplications = 256;

  explicit AlertCoolDown(Limits limits, std::function<Clock::time_point()> now = Clock::now)
      : _limits(limits),
        _now(std::move(now)) {}

  /// How long the application's alerts are not to be shown yet; none when they may be.
  std::optional<Clock::duration> remainingFor(const std::string& application);

  /// The same, as what the application is told.
  std::optional<BusFailure> refusalFor(const std::string& application);

  /// Notes how an alert of the application ended. Answers whether a cool-down begins with it.
  bool note(const std::string& application, AlertEnding ending);

 private:
  struct Counts {
    unsigned refusals = 0;
    unsigned unanswered = 0;
    Clock::time_point coolUntil;
    Clock::time_point lastNoted;
  };

  Counts& countsOf(const std::string& application);

  const Limits _limits;
  const std::function<Clock::time_point()> _now;
  std::mutex _mutex;
  std::map<std::string, Counts> _counts;
};

}  // namespace palisade
