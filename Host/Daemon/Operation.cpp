#include "Host/Daemon/Operation.h"

#include <utility>

#include "Platform/AccountConstants.h"

namespace palisade {
namespace {

thread_local Operation* currentOperation = nullptr;

BusFailure accessRevoked() {
  return {BusFailureKind::accessRevoked, "The application's access was taken back while this request waited. Ask again."};
}

}  // namespace

Operation* Operation::current() { return currentOperation; }

OperationScope::OperationScope(Operation& operation) { currentOperation = &operation; }
OperationScope::~OperationScope() { currentOperation = nullptr; }

void Operation::aboutToWait() {
  const auto first = std::exchange(_beforeFirstWait, nullptr);
  if (!first) return;
  try {
    first();
  } catch (const BusFailure& failure) {
    fail(failure);
    throw;
  }
}

std::optional<Error> Operation::noteGrant(const std::function<std::optional<Error>(const Intent&)>& note) {
  if (!_grant) return std::nullopt;
  const std::lock_guard lock(_notingMutex);
  if (!std::exchange(_hasNotedGrant, true)) _noteError = unlessRevoked([&] { return note(*_grant); });
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
  {
    const std::lock_guard lock(_mutex);
    _isWithdrawn.store(true, std::memory_order_release);
  }
  interrupt(Interruption::withdrawal);
}

void Operation::revoke() {
  fail(accessRevoked());
  {
    const std::lock_guard lock(_mutex);
    _isRevoked.store(true, std::memory_order_release);
    _isWithdrawn.store(true, std::memory_order_release);
  }
  interrupt(Interruption::revocation);
  // Whoever writes has seen that the operation stands; whoever comes now will see that it does not.
  const std::lock_guard lastWriteHasEnded(_writing);
}

std::optional<Error> Operation::unlessRevoked(const std::function<std::optional<Error>()>& write) {
  const std::lock_guard lock(_writing);
  if (!isRevoked()) return write();
  return Error{
      .domain = std::string(AccountsErrorDomain), .code = AccountsErrorAccessDenied, .description = accessRevoked().what()};
}

void Operation::tokenIsAskedFor(const std::string& appID) {
  const std::lock_guard lock(_mutex);
  if (!_appOfAskedToken) _appOfAskedToken = appID;
}

std::optional<std::string> Operation::appOfAskedToken() const {
  const std::lock_guard lock(_mutex);
  return _appOfAskedToken;
}

void Operation::interrupt(Interruption reason) {
  std::set<std::shared_ptr<const Interrupt>> interrupts;
  {
    const std::lock_guard lock(_mutex);
    interrupts = _interrupts;
  }
  for (const auto& interrupt : interrupts) {
    if (reason == Interruption::revocation || interrupt->kind == Interruption::withdrawal) interrupt->call();
  }
}

std::shared_ptr<const void> Operation::interruptWith(std::function<void()> interrupt, Interruption kind) {
  auto registered = std::make_shared<const Interrupt>(Interrupt{.call = std::move(interrupt), .kind = kind});
  bool isDueAlready = false;
  {
    const std::lock_guard lock(_mutex);
    _interrupts.insert(registered);
    isDueAlready = kind == Interruption::revocation ? isRevoked() : isWithdrawn();
  }
  if (isDueAlready) registered->call();
  // A wait may outlast the thread that carried the operation.
  return std::shared_ptr<const void>(registered.get(), [this, keepAlive = weak_from_this().lock(), registered](const void*) {
    const std::lock_guard lock(_mutex);
    _interrupts.erase(registered);
  });
}

}  // namespace palisade
