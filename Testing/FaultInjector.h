#pragma once

/// Makes platform calls throw, by number or by name.
///
/// Purpose: a plug-in has to answer every request exactly once, and never with a grant, whatever service fails at whatever
/// moment. A test walks n = 1, 2, 3... over one operation until nothing is thrown any more. Every call of a plug-in counts:
/// getters, look-ups, `Log::isEnabled`, the JSON parser and the work on a serial queue as well as the calls that a trace shows.
/// A call that throws has done nothing and is not in the trace.
/// Threads: safe from every thread; calls are numbered in the order in which they come.

#include <cstddef>
#include <functional>
#include <map>
#include <mutex>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>

namespace palisade {

/// What a failing call throws unless `raise` says otherwise; `what()` names the call.
class InjectedFault : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

class FaultInjector {
 public:
  /// Makes the n-th call from now on throw; the first is 1.
  void throwOnCall(std::size_t n);
  /// Makes the n-th call from now on and every later one throw.
  void throwFromCall(std::size_t n);

  /// Makes the n-th call of that name from now on throw: "KeychainManager.setCredentialForAccount", "Client.bundleID".
  void throwOn(std::string_view call, std::size_t n = 1);
  /// Makes every call of that name throw.
  void throwAlwaysOn(std::string_view call);

  /// Throws something else than `InjectedFault`: `raise` is called with the sentence that names the call, and has to throw.
  void raiseWith(std::function<void(const std::string& fault)> raise);

  /// Takes back every order; starts numbering anew.
  void clear();

  /// How many calls there were since the start, the last `clear` or the last order by number.
  std::size_t callCount() const;

  /// The call that threw first, or none. Ends a walk: no call had that number any more.
  std::optional<std::string> firstFault() const;
  bool hasThrown() const { return firstFault().has_value(); }

  /// For the fakes: counts one call and throws when it is to fail.
  void enter(std::string_view call);

  /// While one lives, the calling thread's calls neither count nor throw: the fake itself looks something up.
  class Pause {
   public:
    Pause();
    ~Pause();

    Pause(const Pause&) = delete;
    Pause& operator=(const Pause&) = delete;
  };

 private:
  struct Order {
    std::size_t from = 0;
    bool isSticky = false;
    std::size_t calls = 0;

    bool failsNow();
  };

  mutable std::mutex _mutex;
  std::size_t _callCount = 0;
  std::optional<Order> _byNumber;
  std::map<std::string, Order, std::less<>> _byName;
  std::function<void(const std::string&)> _raise;
  std::optional<std::string> _firstFault;
};

}  // namespace palisade
