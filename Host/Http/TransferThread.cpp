#include "Host/Http/TransferThread.h"

#include <algorithm>
#include <stdexcept>
#include <utility>

#include "Host/Http/QuietThread.h"
#include "Host/Secrets/Wipe.h"

namespace palisade {
namespace {

// The most connections at a time; further transfers wait for one. Of those that are done, a few are kept for the next request.
constexpr long mostConnections = 64;
constexpr long mostIdleConnections = 4;

constexpr int untilSomethingHappens = 3'600'000;  // milliseconds; the library wakes up earlier for limits of its own

}  // namespace

std::uint64_t TransferThread::start(HttpRequest request, HttpHandler handler) {
  std::unique_lock lock(_mutex);
  const std::uint64_t number = ++_lastNumber;
  _delivery.start();
  try {
    if (!_thread.joinable()) startThread();
  } catch (const std::runtime_error& error) {
    deliver(std::move(handler), httpError(HttpErrorUnavailable, error.what()));
    return number;
  }
  _ordered.push_back({.number = number, .request = std::move(request), .handler = std::move(handler)});
  lock.unlock();
  _curl->multiWakeUp(_multi);
  return number;
}

void TransferThread::startThread() {
  _curl = &CurlLibrary::loaded();
  if (_multi == nullptr) _multi = _curl->multiInit();
  if (_multi == nullptr) throw std::runtime_error("The HTTP library has no memory or descriptors left.");
  _curl->multiSet(_multi, CURLMOPT_MAX_TOTAL_CONNECTIONS, mostConnections);
  _curl->multiSet(_multi, CURLMOPT_MAXCONNECTS, mostIdleConnections);
  _thread = startQuietThread("http", [this] { run(); });
}

void TransferThread::cancel(std::uint64_t number) {
  const std::lock_guard lock(_mutex);
  if (!_thread.joinable() || _ending) return;
  _cancelled.push_back(number);
  _curl->multiWakeUp(_multi);
}

void TransferThread::end() {
  {
    const std::lock_guard lock(_mutex);
    _ending = true;
    if (_thread.joinable()) _curl->multiWakeUp(_multi);
  }
  if (_thread.joinable()) _thread.join();
  if (_multi != nullptr) _curl->multiCleanup(std::exchange(_multi, nullptr));
  _delivery.end();
}

void TransferThread::run() {
  while (true) {
    std::vector<Order> ordered;
    std::vector<std::uint64_t> cancelled;
    bool ending = false;
    {
      const std::lock_guard lock(_mutex);
      ordered.swap(_ordered);
      cancelled.swap(_cancelled);
      ending = _ending;
    }
    for (Order& order : ordered) carryOut(std::move(order));
    for (const std::uint64_t number : cancelled) giveUp(number);
    if (ending) break;

    int stillRunning = 0;
    _curl->multiPerform(_multi, &stillRunning);
    settleFinished();
    wipeDeadStack();
    // Returns at once for a transfer that starts afresh.
    _curl->multiPoll(_multi, nullptr, 0, untilSomethingHappens, nullptr);
  }
  while (!_transfers.empty()) giveUp(_transfers.begin()->first);
}

void TransferThread::carryOut(Order order) {
  try {
    auto carried = std::make_unique<CurlTransfer>(*_curl, _options, std::move(order.request));
    if (_curl->multiAdd(_multi, carried->handle()) != CURLM_OK) throw std::bad_alloc();
    _transfers.emplace(order.number, Transfer{.carried = std::move(carried), .handler = std::move(order.handler)});
  } catch (const std::invalid_argument& error) {
    deliver(std::move(order.handler), httpError(HttpErrorInvalidRequest, error.what()));
  } catch (const std::runtime_error& error) {
    deliver(std::move(order.handler), httpError(HttpErrorUnavailable, error.what()));
  } catch (const std::bad_alloc&) {
    deliver(std::move(order.handler), httpError(HttpErrorUnavailable, "There is no memory left for a request."));
  }
}

void TransferThread::giveUp(std::uint64_t number) {
  settle(number, httpError(HttpErrorCancelled, "The request was cancelled."));
}

void TransferThread::settleFinished() {
  int left = 0;
  while (const CURLMsg* message = _curl->multiReadInfo(_multi, &left)) {
    const auto finished = std::find_if(_transfers.begin(), _transfers.end(), [message](const auto& entry) {
      return entry.second.carried->handle() == message->easy_handle;
    });
    CurlTransfer& transfer = *finished->second.carried;
    const CURLcode code = message->data.result;
    if (transfer.mustStartAfresh()) {
      _curl->multiRemove(_multi, transfer.handle());
      _curl->multiAdd(_multi, transfer.handle());
    } else {
      settle(finished->first, transfer.result(code));
    }
  }
}

void TransferThread::settle(std::uint64_t number, HttpResult result) {
  const auto transfer = _transfers.find(number);
  if (transfer == _transfers.end()) return;
  deliver(std::move(transfer->second.handler), std::move(result));
  _curl->multiRemove(_multi, transfer->second.carried->handle());
  _transfers.erase(transfer);
}

void TransferThread::deliver(HttpHandler handler, HttpResult result) {
  _delivery.deliver([handler = std::move(handler), result = std::move(result)]() mutable { handler(std::move(result)); });
}

}  // namespace palisade
