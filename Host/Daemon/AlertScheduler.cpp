#include "Host/Daemon/AlertScheduler.h"

#include <cerrno>

#include "Host/Daemon/Operation.h"

namespace palisade {

// An alert's place in the queue; it is given up when the alert is released.
struct AlertScheduler::Place final : AlertHandle {
  Place(AlertScheduler& owner, std::uint64_t number, std::shared_ptr<AlertHandle> alert)
      : scheduler(owner),
        ticket(number),
        shown(std::move(alert)) {}
  ~Place() override {
    if (shown != nullptr) scheduler._frontEnd.releaseAlert(std::move(shown));
    scheduler.leave(ticket);
  }

  AlertScheduler& scheduler;
  std::uint64_t ticket;
  std::shared_ptr<AlertHandle> shown;
};

std::shared_ptr<AlertHandle> AlertScheduler::createAlert(AlertAllocator allocator, double timeoutSeconds, unsigned flags,
                                                         int* errorPlace, const AlertDescription& description) {
  Operation* operation = Operation::current();
  if (operation != nullptr) operation->aboutToWait();

  std::uint64_t ticket = 0;
  {
    std::unique_lock lock(_mutex);
    ticket = ++_lastTicket;
    _queue.insert(ticket);
    lock.unlock();
    const auto interrupted = operation == nullptr ? nullptr : operation->interruptWith([this] {
      const std::lock_guard guard(_mutex);
      _hasMoved.notify_all();
    });
    lock.lock();
    _hasMoved.wait(lock, [&] { return *_queue.begin() == ticket || (operation != nullptr && operation->isWithdrawn()); });
  }

  std::shared_ptr<AlertHandle> shown;
  if (operation == nullptr || !operation->isWithdrawn()) {
    shown = _frontEnd.createAlert(allocator, timeoutSeconds, flags, errorPlace, description);
  }
  if (shown == nullptr) {
    leave(ticket);
    return nullptr;
  }
  return std::make_shared<Place>(*this, ticket, std::move(shown));
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
  // An answer that comes after the withdrawal, or beside an error, is nobody's.
  if (status != 0 || (operation != nullptr && operation->isWithdrawn())) return status;
  if (word != AlertResponseDefaultButton && word != AlertResponseAlternateButton) return 0;
  if (operation != nullptr) operation->userHasAnswered();
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

}  // namespace palisade
