#include "Host/Daemon/AlertScheduler.h"

#include <cerrno>

#include "Host/Daemon/Operation.h"

namespace palisade {
namespace {

constexpr const char* coolDownPlace = "coolDown";

// The application that the operation would have the user asked about; null when it is nobody's in particular.
const std::string* applicationOf(const Operation* operation) {
  return operation != nullptr && operation->grant() ? &operation->grant()->clientID : nullptr;
}

BusFailure queueIsFull() {
  return {BusFailureKind::notAsked, std::to_string(AlertScheduler::mostWaiting) +
                                        " questions wait for the user already. Ask again when some are answered."};
}

}  // namespace

// An alert's place in the queue; it is given up when the alert is released.
struct AlertScheduler::Place final : AlertHandle {
  explicit Place(AlertScheduler& owner) : scheduler(owner) {}
  ~Place() override {
    if (shown != nullptr) scheduler._frontEnd.releaseAlert(std::move(shown));
    scheduler.leave(ticket);
  }

  AlertScheduler& scheduler;
  /// No ticket of the queue's before it stands there.
  std::uint64_t ticket = 0;
  std::shared_ptr<AlertHandle> shown;
};

std::shared_ptr<AlertHandle> AlertScheduler::createAlert(AlertAllocator allocator, double timeoutSeconds, unsigned flags,
                                                         int* errorPlace, const AlertDescription& description) {
  Operation* operation = Operation::current();
  auto place = queueUp(operation);
  if (place == nullptr) {
    if (errorPlace != nullptr) *errorPlace = EAGAIN;
    return nullptr;
  }
  waitForTurn(*place, operation);
  if (operation != nullptr && operation->isWithdrawn()) return nullptr;
  place->shown = _frontEnd.createAlert(allocator, timeoutSeconds, flags, errorPlace, description);
  if (place->shown == nullptr) return nullptr;
  if (operation != nullptr) operation->userIsAsked();
  return place;
}

// Whoever is not shown learns it at once, without waiting for anybody.
std::shared_ptr<AlertScheduler::Place> AlertScheduler::queueUp(Operation* operation) {
  if (const std::string* application = applicationOf(operation)) {
    if (const auto refusal = _coolDown.refusalFor(*application)) {
      operation->fail(*refusal);
      return nullptr;
    }
  }
  auto place = std::make_shared<Place>(*this);
  {
    const std::lock_guard lock(_mutex);
    if (_queue.size() <= mostWaiting) {
      place->ticket = ++_lastTicket;
      _queue.insert(place->ticket);
      return place;
    }
  }
  if (operation != nullptr) operation->fail(queueIsFull());
  return nullptr;
}

void AlertScheduler::waitForTurn(const Place& place, Operation* operation) {
  if (operation != nullptr) operation->aboutToWait();
  const auto interrupted = operation == nullptr ? nullptr : operation->interruptWith([this] {
    const std::lock_guard guard(_mutex);
    _hasMoved.notify_all();
  });
  std::unique_lock lock(_mutex);
  _hasMoved.wait(lock, [&] { return *_queue.begin() == place.ticket || (operation != nullptr && operation->isWithdrawn()); });
}

int AlertScheduler::receiveResponse(const std::shared_ptr<AlertHandle>& handle, double timeoutSeconds,
                                    AlertResponse& response) {
  response = AlertResponseNobody;
  Operation* operation = Operation::current();
  if (operation != nullptr) operation->alertWentUnanswered();
  const auto place = std::dynamic_pointer_cast<Place>(handle);
  if (place == nullptr) return EINVAL;

  AlertResponse word = AlertResponseNobody;
  int status = 0;
  {
    const auto interrupted =
        operation == nullptr ? nullptr : operation->interruptWith([this, place] { _takeDown(place->shown); });
    status = _frontEnd.receiveResponse(place->shown, timeoutSeconds, word);
  }
  if (status == ECANCELED) return 0;
  const bool isButton = word == AlertResponseDefaultButton || word == AlertResponseAlternateButton;
  // An answer that comes after the withdrawal, or beside an error, is nobody's.
  if (status != 0 || !isButton || (operation != nullptr && operation->isWithdrawn())) {
    note(operation, AlertEnding::unanswered);
    return status;
  }
  if (operation != nullptr) operation->userHasAnswered();
  note(operation, word == AlertResponseDefaultButton ? AlertEnding::allowed : AlertEnding::refused);
  response = word;
  return 0;
}

void AlertScheduler::releaseAlert(std::shared_ptr<AlertHandle> handle) { handle.reset(); }

void AlertScheduler::leave(std::uint64_t ticket) {
  {
    const std::lock_guard lock(_mutex);
    _queue.erase(ticket);
  }
  _hasMoved.notify_all();
}

void AlertScheduler::note(const Operation* operation, AlertEnding ending) {
  const std::string* application = applicationOf(operation);
  if (application == nullptr || !_coolDown.note(*application, ending)) return;
  _log.record(coolDownPlace, LogLevel::notice, "%@ was turned down too often: the user is not asked about it for a while.",
              "application", *application);
}

}  // namespace palisade
