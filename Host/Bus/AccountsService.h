#pragma once

/// What stands behind the daemon's D-Bus interface, in the daemon's own terms. The interface itself is described in
/// DBus/com.veltran.Accounts1.xml.
///
/// Threads: each operation runs on a thread of the bus loop and may take as long as a user does; several run at once.
/// `requestAccess`, `authorize` and `addAccount` begin on the thread that reads the bus, as long as their caller's application
/// is known, and call `BusLoop::handOver` before they wait for anything. `knownApplication`, `close` and `callerLeft` come from
/// that thread too and never wait. Ownership: arguments are values. Errors: a `BusFailure` is thrown and becomes the call's
/// error reply; any other exception becomes the error "Failed".

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <stdexcept>
#include <string>
#include <vector>

#include "Host/Identity/CallingConnection.h"
#include "Platform/Error.h"
#include "Platform/Value.h"

namespace palisade {

/// The errors of the interface; each is the last element of com.veltran.Accounts1.Error.NAME.
enum class BusFailureKind {
  invalidArguments,
  notPermitted,
  unknownCaller,
  noSuchAccount,
  noSuchClient,
  notGranted,
  tooManyRequests,
  notAsked,
  accessRevoked,
  keychainUnavailable,
  storeUnavailable,
  failed
};

class BusFailure : public std::runtime_error {
 public:
  /// `message` is a sentence for people that says what is wrong and, where there is something, what to do.
  BusFailure(BusFailureKind kind, const std::string& message) : std::runtime_error(message), _kind(kind) {}

  BusFailureKind kind() const { return _kind; }

 private:
  BusFailureKind _kind;
};

/// A connection to the bus.
struct BusCaller {
  std::string uniqueName;
  /// Asks the bus about it, and waits for the answer; throws when the connection is gone.
  std::function<CallingConnection()> describe;
};

enum class AccessResponse : std::uint32_t { granted = 0, refused = 1, withdrawn = 2, pending = 3 };

struct AccessOutcome {
  AccessResponse response = AccessResponse::refused;
  std::optional<Error> error = std::nullopt;
};

/// A request for access under way.
class PendingRequest {
 public:
  virtual ~PendingRequest() = default;
  /// The operation is about to wait: lets another thread read the bus, which first answers the call with the path of a Request
  /// object. The outcome then comes as the object's signal. Called once, on the thread that carries the request.
  virtual void becomePending() = 0;
  /// Tells a caller that holds a Request object the outcome, from whatever thread brings it; what the operation answers later
  /// is passed over. Does nothing for a call that waits for its reply.
  virtual void answerAtOnce(const AccessOutcome& outcome) = 0;
  /// Tells requests apart in `AccountsService::close`.
  virtual std::uint64_t identifier() const = 0;
};

using Rows = std::vector<Dictionary>;

class AccountsService {
 public:
  virtual ~AccountsService() = default;

  /// The application behind a connection, once it has been identified.
  virtual std::optional<std::string> knownApplication(const BusCaller& caller) = 0;
  virtual std::string identify(const BusCaller& caller) = 0;

  virtual AccessOutcome requestAccess(const BusCaller& caller, const std::string& accountType,
                                      const std::shared_ptr<const Dictionary>& accessOptions, PendingRequest& request) = 0;
  virtual AccessOutcome authorize(const BusCaller& caller, const std::string& accountType, const std::string& client,
                                  PendingRequest& request) = 0;
  virtual std::string credential(const BusCaller& caller, const std::string& accountType) = 0;

  virtual Rows listAccounts(const BusCaller& caller, const std::string& accountType) = 0;
  /// Takes one more token that a caller is about to send, as long as the result lives. Does not wait; too many are a failure.
  virtual std::shared_ptr<const void> admitToken(const BusCaller& caller) = 0;
  /// `readToken` waits for whoever sends the token, for seconds at most.
  virtual std::string addAccount(const BusCaller& caller, const std::string& accountType, const std::string& username,
                                 const std::function<std::string()>& readToken) = 0;
  virtual void removeAccount(const BusCaller& caller, const std::string& id) = 0;

  virtual Rows listGrants(const BusCaller& caller, const std::string& accountType) = 0;
  virtual void revoke(const BusCaller& caller, const std::string& accountType, const std::string& client) = 0;
  virtual void revokeAll(const BusCaller& caller, const std::string& accountType) = 0;

  virtual Rows history(const BusCaller& caller, std::uint32_t limit, const std::optional<std::string>& client) = 0;
  virtual Rows listRevocations(const BusCaller& caller) = 0;
  virtual Rows listClients(const BusCaller& caller) = 0;
  virtual std::optional<Value> preference(const BusCaller& caller, const std::string& domain, const std::string& key) = 0;
  virtual void setPreference(const BusCaller& caller, const std::string& domain, const std::string& key,
                             const std::optional<Value>& value) = 0;
  virtual Dictionary status(const BusCaller& caller) = 0;

  /// Whether what the caller posts on the notification bus is passed on. Does not throw: whoever cannot be identified posts
  /// nothing.
  virtual bool mayPost(const BusCaller& caller) = 0;

  /// The caller withdraws a pending request of its own.
  virtual void close(std::uint64_t requestIdentifier) = 0;
  /// A connection went away; whatever it asked for and is not answered is withdrawn.
  virtual void callerLeft(const std::string& uniqueName) = 0;
};

}  // namespace palisade
