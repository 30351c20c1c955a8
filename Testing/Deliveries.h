#pragma once

/// Holds the server's answers back until somebody hands them over.
///
/// Purpose: the moment at which an answer arrives is part of a test. `FakePlatform::run` hands answers over by itself, when the
/// operation waits or has returned; a test that calls a plug-in from threads of its own says `deliverNext` or
/// `deliverAutomatically`. Threads: safe from every thread; handlers run on a thread labelled `request`, unless they are
/// delivered in line. Ownership: an answer keeps its handler and its request alive until it has been handed over; a handler
/// that is never called lives until the process ends. Errors: an exception that leaves a handler ends the process.

#include <condition_variable>
#include <cstddef>
#include <deque>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "Platform/FacebookRequest.h"

namespace palisade {

enum class Delivery {
  onThread,  ///< on another thread, when it is handed over
  inLine,    ///< before `performRequestWithHandler` returns
  never,     ///< the handler is kept alive and never called
  twice,     ///< on another thread, two times
  dropped    ///< when it is handed over, the handler is destroyed instead
};

struct ServerAnswer {
  std::optional<std::string> data = std::nullopt;
  std::optional<Error> error = std::nullopt;
  Delivery delivery = Delivery::onThread;
  /// Of the HTTP response that comes with data; without data there is none.
  int statusCode = 200;
};

class Deliveries {
 public:
  /// For the fakes: takes in a performed request.
  void accept(ServerAnswer answer, FacebookRequestHandler handler, std::shared_ptr<const void> request);

  /// Answers that wait to be handed over.
  std::size_t pending() const;

  /// Hands the next answer over and waits until its handler has returned. False when there was none.
  bool deliverNext();

  /// Hands over every answer as soon as it is there, from now on, one at a time.
  void deliverAutomatically();

  /// Takes the next answer off as a piece of work for a thread of the caller's, or none.
  std::optional<std::function<void()>> takeNext();

 private:
  struct Pending {
    ServerAnswer answer;
    FacebookRequestHandler handler;
    std::shared_ptr<const void> request;
  };

  static void handOver(Pending pending);

  mutable std::mutex _mutex;
  std::condition_variable _arrived;
  std::deque<Pending> _pending;
  std::vector<Pending> _neverDelivered;
};

}  // namespace palisade
