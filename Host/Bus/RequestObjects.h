#pragma once

/// The Request objects of requests that wait, each at /com/veltran/Accounts1/request/SENDER/TOKEN.
///
/// Threads: a request is made and finished by the thread that carries it, announced by the thread that reads the bus, on which
/// Close arrives too, and may be answered by any. Ownership: a request owns its object, which goes away with it. Errors: a
/// token that is no path element, or is taken, is a `BusFailure`.

#include <sdbus-c++/sdbus-c++.h>

#include <atomic>
#include <cstdint>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <set>
#include <string>

#include "DBus/BusValue.h"
#include "Host/Bus/AccountsService.h"

namespace palisade {

using AccessResult = sdbus::Result<sdbus::ObjectPath, std::uint32_t, BusDictionary>;

class RequestObjects {
 public:
  /// `close` is called with a request's identifier when its caller withdraws it.
  RequestObjects(sdbus::IConnection& connection, std::function<void(std::uint64_t)> close);

  /// The path for a request of `caller`, reserved until the handle goes away.
  std::shared_ptr<const std::string> reserve(const std::string& caller, const std::string& token);

 private:
  friend class BusRequest;

  sdbus::IConnection& _connection;
  std::function<void(std::uint64_t)> _close;
  std::mutex _mutex;
  std::set<std::string> _paths;
  std::atomic<std::uint64_t> _lastIdentifier = 0;
};

/// One call of RequestAccess or Authorize, from its message to its answer.
class BusRequest final : public PendingRequest, public std::enable_shared_from_this<BusRequest> {
 public:
  BusRequest(RequestObjects& objects, std::string caller, const std::optional<std::string>& token, AccessResult result);
  ~BusRequest() override;

  void becomePending() override;
  void answerAtOnce(const AccessOutcome& outcome) override;
  std::uint64_t identifier() const override { return _identifier; }

  /// Sends the outcome, unless it has been sent: as the reply, or as the Response signal once the reply has gone.
  void finish(const AccessOutcome& outcome);
  /// Sends a failure; to a caller that holds a Request object, as a refusal with a message.
  void fail(const BusFailure& failure);

 private:
  // Both are called under the lock.
  void announce();
  void send(const AccessOutcome& outcome);

  RequestObjects& _objects;
  std::string _caller;
  std::uint64_t _identifier;
  std::mutex _mutex;  // guards what follows
  std::shared_ptr<const std::string> _path;
  AccessResult _result;
  std::unique_ptr<sdbus::IObject> _object;
  bool _isPending = false;
  bool _isAnswered = false;
};

/// The error of the bus that a failure becomes.
sdbus::Error busError(const BusFailure& failure);

}  // namespace palisade
