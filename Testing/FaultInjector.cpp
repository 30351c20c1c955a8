#include "Testing/FaultInjector.h"

#include <utility>

namespace palisade {
namespace {

thread_local int pauses = 0;

}  // namespace

FaultInjector::Pause::Pause() { ++pauses; }
FaultInjector::Pause::~Pause() { --pauses; }

bool FaultInjector::Order::failsNow() {
  ++calls;
  return isSticky ? calls >= from : calls == from;
}

void FaultInjector::throwOnCall(std::size_t n) {
  const std::lock_guard lock(_mutex);
  _byNumber = Order{.from = n};
  _callCount = 0;
}

void FaultInjector::throwFromCall(std::size_t n) {
  const std::lock_guard lock(_mutex);
  _byNumber = Order{.from = n, .isSticky = true};
  _callCount = 0;
}

void FaultInjector::throwOn(std::string_view call, std::size_t n) {
  const std::lock_guard lock(_mutex);
  _byName[std::string(call)] = Order{.from = n};
}

void FaultInjector::throwAlwaysOn(std::string_view call) {
  const std::lock_guard lock(_mutex);
  _byName[std::string(call)] = Order{.from = 1, .isSticky = true};
}

void FaultInjector::raiseWith(std::function<void(const std::string&)> raise) {
  const std::lock_guard lock(_mutex);
  _raise = std::move(raise);
}

void FaultInjector::clear() {
  const std::lock_guard lock(_mutex);
  _callCount = 0;
  _byNumber.reset();
  _byName.clear();
  _raise = nullptr;
  _firstFault.reset();
}

std::size_t FaultInjector::callCount() const {
  const std::lock_guard lock(_mutex);
  return _callCount;
}

std::optional<std::string> FaultInjector::firstFault() const {
  const std::lock_guard lock(_mutex);
  return _firstFault;
}

void FaultInjector::enter(std::string_view call) {
  if (pauses > 0) return;
  std::string fault;
  std::function<void(const std::string&)> raise;
  {
    const std::lock_guard lock(_mutex);
    ++_callCount;
    const auto named = _byName.find(call);
    const bool failsByName = named != _byName.end() && named->second.failsNow();
    const bool failsByNumber = _byNumber && _byNumber->failsNow();
    if (!failsByName && !failsByNumber) return;
    if (!_firstFault) _firstFault = std::string(call);
    fault = "injected fault in call " + std::to_string(_callCount) + ", " + std::string(call);
    raise = _raise;
  }
  if (raise) raise(fault);
  throw InjectedFault(fault);
}

}  // namespace palisade
