#include "Testing/Deliveries.h"

#include <thread>
#include <utility>

#include "Testing/Trace.h"

namespace palisade {

void Deliveries::accept(ServerAnswer answer, FacebookRequestHandler handler, std::shared_ptr<const void> request) {
  Pending pending{std::move(answer), std::move(handler), std::move(request)};
  if (pending.answer.delivery == Delivery::inLine) return handOver(std::move(pending));
  const std::lock_guard lock(_mutex);
  auto& destination = pending.answer.delivery == Delivery::never ? _neverDelivered.emplace_back() : _pending.emplace_back();
  destination = std::move(pending);
  _arrived.notify_all();
}

std::size_t Deliveries::pending() const {
  const std::lock_guard lock(_mutex);
  return _pending.size();
}

bool Deliveries::deliverNext() {
  auto work = takeNext();
  if (!work) return false;
  std::thread([&work] {
    const ThreadLabelScope label(ThreadLabel::request);
    (*work)();
    work.reset();
  }).join();
  return true;
}

void Deliveries::deliverAutomatically() {
  std::thread([this] {
    const ThreadLabelScope label(ThreadLabel::request);
    for (;;) {
      {
        std::unique_lock lock(_mutex);
        _arrived.wait(lock, [this] { return !_pending.empty(); });
      }
      if (const auto work = takeNext()) (*work)();
    }
  }).detach();
}

std::optional<std::function<void()>> Deliveries::takeNext() {
  const std::lock_guard lock(_mutex);
  if (_pending.empty()) return std::nullopt;
  auto next = std::make_shared<Pending>(std::move(_pending.front()));
  _pending.pop_front();
  return [next] { handOver(std::move(*next)); };
}

void Deliveries::handOver(Pending pending) {
  const ServerAnswer& answer = pending.answer;
  const auto response = answer.data ? std::optional(HttpResponse{answer.statusCode}) : std::nullopt;
  const int calls = answer.delivery == Delivery::dropped ? 0 : answer.delivery == Delivery::twice ? 2 : 1;
  for (int call = 0; call < calls; ++call) pending.handler(answer.data, response, answer.error);
}

}  // namespace palisade
