#pragma once

/// One operation that a client asked for, while it is carried out.
///
/// Purpose: services that the plug-in calls learn from it for whom they work, tell it that they are about to wait, and hear
/// from it that the operation was withdrawn, or that the access it is about was taken back. Threads: made and ended by the
/// thread that carries the operation, whose current operation it then is; `withdraw` and `revoke` come from any thread.
/// Ownership: shared with whoever may withdraw it, and with each wait that may be interrupted. Errors: none.

#include <atomic>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <set>
#include <string>

#include "Host/Accounts/Intent.h"
#include "Host/Bus/AccountsService.h"
#include "Host/Identity/RegisteredClient.h"

namespace palisade {

class Operation : public std::enable_shared_from_this<Operation> {
 public:
  /// `beforeFirstWait` is called once, on the operation's thread, before it waits for a user or a server.
  /// `grant` is what the operation may come to.
  /// `client` is who asked for it, as it was identified when it called.
  explicit Operation(std::function<void()> beforeFirstWait, std::optional<Intent> grant = std::nullopt,
                     std::shared_ptr<const RegisteredClient> client = nullptr)
      : _beforeFirstWait(std::move(beforeFirstWait)),
        _grant(std::move(grant)),
        _client(std::move(client)) {}

  /// The operation that the calling thread carries, or null.
  static Operation* current();

  const std::optional<Intent>& grant() const { return _grant; }
  const std::shared_ptr<const RegisteredClient>& client() const { return _client; }

  /// Notes with `note` what the operation may come to, before anything of it is done. The first call notes; another one, from
  /// whatever thread, waits for that and learns what it answered. Without a grant nothing is noted.
  std::optional<Error> noteGrant(const std::function<std::optional<Error>(const Intent&)>& note);
  bool hasNotedGrant() const;

  /// The operation may wait for long from here on. What `beforeFirstWait` throws is passed on, and fails the operation.
  void aboutToWait();

  /// Ends what the operation waits for, now or later; from then on nobody will answer it. Does not wait.
  void withdraw();
  bool isWithdrawn() const { return _isWithdrawn.load(std::memory_order_acquire); }

  /// Withdraws the operation, and also ends its waits for what the user has allowed already. It fails with a sentence that says
  /// so, and stores nothing from here on: returns when a write that was under way has ended.
  void revoke();
  bool isRevoked() const { return _isRevoked.load(std::memory_order_acquire); }

  /// Carries out a write unless the operation was revoked, which waits for the end of the write; answers its error, or that.
  std::optional<Error> unlessRevoked(const std::function<std::optional<Error>()>& write);

  enum class Interruption {
    withdrawal,  ///< of whatever kind
    revocation   ///< a mere withdrawal lets the wait go on
  };

  /// Calls `interrupt` when the operation is withdrawn while the result lives, or at once if it has been.
  [[nodiscard]] std::shared_ptr<const void> interruptWith(std::function<void()> interrupt,
                                                          Interruption kind = Interruption::withdrawal);

  /// The server is about to be asked for a token for the app. The first call counts.
  void tokenIsAskedFor(const std::string& appID);
  std::optional<std::string> appOfAskedToken() const;

  /// The keychain or the server is about to be asked, before the user is.
  void keepsServicesBusy() { _keepsServicesBusy.store(true, std::memory_order_release); }
  bool hasKeptServicesBusy() const { return _keepsServicesBusy.load(std::memory_order_acquire); }

  /// An alert of the operation stands before the user.
  void userIsAsked() { _userAsked.store(true, std::memory_order_release); }
  bool wasUserAsked() const { return _userAsked.load(std::memory_order_acquire); }

  /// Whether the user has answered: pressed one of the two buttons.
  void userHasAnswered() { _userAnswered.store(true, std::memory_order_release); }
  bool isAnsweredByUser() const { return _userAnswered.load(std::memory_order_acquire); }

  /// An alert of the operation ended without an answer: it was closed or taken down, or there was nobody to ask.
  void alertWentUnanswered() { _wentUnanswered.store(true, std::memory_order_release); }
  bool isLeftUnanswered() const { return isWithdrawn() || _wentUnanswered.load(std::memory_order_acquire); }

  /// A refusal that no user gave is stored for the operation, until it ends.
  void refusalByNobodyIsStored() { _hasStoredRefusalByNobody.store(true, std::memory_order_release); }
  bool hasStoredRefusalByNobody() const { return _hasStoredRefusalByNobody.load(std::memory_order_acquire); }

  /// A step of the operation could not be stored, or its user is not to be asked: whatever its plug-in answers, it has failed.
  /// The first failure counts.
  void fail(const BusFailure& failure);
  std::optional<BusFailure> failure() const;

 private:
  friend class OperationScope;

  struct Interrupt {
    std::function<void()> call;
    Interruption kind;
  };

  void interrupt(Interruption reason);

  std::function<void()> _beforeFirstWait;
  const std::optional<Intent> _grant;
  const std::shared_ptr<const RegisteredClient> _client;
  std::atomic<bool> _isWithdrawn = false;
  std::atomic<bool> _isRevoked = false;
  std::atomic<bool> _keepsServicesBusy = false;
  std::atomic<bool> _userAsked = false;
  std::atomic<bool> _userAnswered = false;
  std::atomic<bool> _wentUnanswered = false;
  std::atomic<bool> _hasStoredRefusalByNobody = false;
  mutable std::mutex _mutex;
  std::set<std::shared_ptr<const Interrupt>> _interrupts;
  std::optional<BusFailure> _failure;
  std::optional<std::string> _appOfAskedToken;
  std::mutex _writing;
  mutable std::mutex _notingMutex;
  bool _hasNotedGrant = false;
  std::optional<Error> _noteError;
};

/// Makes an operation the calling thread's current one.
class OperationScope {
 public:
  explicit OperationScope(Operation& operation);
  ~OperationScope();

  OperationScope(const OperationScope&) = delete;
  OperationScope& operator=(const OperationScope&) = delete;
};

}  // namespace palisade
