#include "Host/Daemon/Operation.h"

#include <utility>

namespace palisade {
namespace {

thread_local Operation* currentOperation = nullptr;

}  // namespace

Operation* Operation::current() { return currentOperation; }

OperationScope::OperationScope(Operation& operation) { currentOperation = &operation; }
OperationScope::~OperationScope() { currentOperation = nullptr; }

void Operation::aboutToWait() {
  if (const auto first = std::exchange(_beforeFirstWait, nullptr)) first();
}

std::optional<Error> Operation::noteGrant(const std::function<std::optional<Error>(const Intent&)>& note) {
  if (!_grant) return std::nullopt;
  const std::lock_guard lock(_notingMutex);
  if (!std::exchange(_hasNotedGrant, true)) _noteError = note(*_grant);
  return _noteError;
}

bool Operation::hasNotedGrant() const {
  const std::lock_guard lock(_notingMutex);
  return _hasNotedGrant;
}

void Operation::fail(const BusFailure& failure) {
  const std::lock_guard lock(_mutex);
  if (!_failure) _failure = failure;
}

std::optional<BusFailure> Operation::failure() const {
  const std::lock_guard lock(_mutex);
  return _failure;
}

void Operation::withdraw() {
  std::set<std::shared_ptr<const std::function<void()>>> interrupts;
  {
    const std::lock_guard lock(_mutex);
    _isWithdrawn.store(true, std::memory_order_release);
    interrupts = _interrupts;
  }
  for (const auto& interrupt : interrupts) (*interrupt)();
}

std::shared_ptr<const void> Operation::interruptWith(std::function<void()> interrupt) {
  auto registered = std::make_shared<const std::function<void()>>(std::move(interrupt));
  bool isWithdrawnAlready = false;
  {
    const std::lock_guard lock(_mutex);
    _interrupts.insert(registered);
    isWithdrawnAlready = isWithdrawn();
  }
  if (isWithdrawnAlready) (*registered)();
  return std::shared_ptr<const void>(registered.get(), [this, registered](const void*) {
    const std::lock_guard lock(_mutex);
    _interrupts.erase(registered);
  });
}

}  // namespace palisade
