#pragma once

/// The thread that carries all transfers of a client, and what others tell it.
///
/// Threads: `start`, `cancel` and `end` may be called from any thread; what touches libcurl happens on the thread itself,
/// except for waking it up. Ownership: shared between the client and its requests. Errors: `start` throws when no thread can be
/// had; the handler is then dropped.

#include <cstdint>
#include <map>
#include <memory>
#include <mutex>
#include <thread>
#include <utility>
#include <vector>

#include "Host/Http/CurlTransfer.h"
#include "Host/Http/DeliveryThreads.h"
#include "Host/Http/HttpClient.h"

namespace palisade {

class TransferThread {
 public:
  explicit TransferThread(HttpClientOptions options) : _options(std::move(options)) {}
  TransferThread(const TransferThread&) = delete;
  TransferThread& operator=(const TransferThread&) = delete;

  /// The number by which the request can be cancelled.
  std::uint64_t start(HttpRequest request, HttpHandler handler);

  void cancel(std::uint64_t number);

  /// Cancels everything and returns when every handler has returned. Nothing may be started afterwards.
  void end();

 private:
  struct Order {
    std::uint64_t number;
    HttpRequest request;
    HttpHandler handler;
  };

  struct Transfer {
    std::unique_ptr<CurlTransfer> carried;
    HttpHandler handler;
  };

  void startThread();
  void run();
  void carryOut(Order order);
  void giveUp(std::uint64_t number);
  void settleFinished();
  void settle(std::uint64_t number, HttpResult result);
  void deliver(HttpHandler handler, HttpResult result);

  const HttpClientOptions _options;
  DeliveryThreads _delivery;

  // Set before the thread starts and left alone while it runs.
  const CurlLibrary* _curl = nullptr;
  CURLM* _multi = nullptr;

  // Of the thread only.
  std::map<std::uint64_t, Transfer> _transfers;

  std::mutex _mutex;
  // Guarded by the mutex.
  std::vector<Order> _ordered;
  std::vector<std::uint64_t> _cancelled;
  std::uint64_t _lastNumber = 0;
  bool _ending = false;
  std::thread _thread;
};

}  // namespace palisade
