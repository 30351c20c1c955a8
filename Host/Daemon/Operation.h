#pragma once

/// One operation that a client asked for, while it is carried out.
///
/// Purpose: services that the plug-in calls learn from it for whom they work, tell it that they are about to wait, and hear
/// from it that the operation was withdrawn. Threads: made and ended by the thread that carries the operation, whose current
/// operation it then is; `withdraw` comes from any thread. Ownership: shared with whoever may withdraw it. Errors: none.

#include <atomic>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <set>

#include "Host/Accounts/Intent.h"
#include "Host/Bus/AccountsService.h"

namespace palisade {

class Operation {
 public:
  /// `beforeFirstWait` is called once, on the operation's thread, before it waits for a user or a server.
  /// `grant` is what the operation may come to.
  explicit Operation(std::function<void()> beforeFirstWait, std::optional<Intent> grant = std::nullopt)
      : _beforeFirstWait(std::move(beforeFirstWait)),
        _grant(std::move(grant)) {}

  /// The operation that the calling thread carries, or null.
  static Operation* current();

  const std::optional<Intent>& grant() const { return _grant; }

  /// Notes with `note` what the operation may come to, before anything of it is done. The first call notes; another one, from
  /// whatever thread, waits for that and learns what it answered. Without a grant nothing is noted.
  std::optional<Error> noteGrant(const std::function<std::optional<Error>(const Intent&)>& note);
  bool hasNotedGrant() const;

  /// The operation may wait for long from here on.
  void aboutToWait();

  /// Ends what the operation waits for, now or later; from then on nobody will answer it.
  void withdraw();
  bool isWithdrawn() const { return _isWithdrawn.load(std::memory_order_acquire); }

  /// Calls `interrupt` when the operation is withdrawn while the result lives, or at once if it has been.
  [[nodiscard]] std::shared_ptr<const void> interruptWith(std::function<void()> interrupt);

  /// An alert of the operation stands before the user.
  void userIsAsked() { _userAsked.store(true, std::memory_order_release); }
  bool wasUserAsked() const { return _userAsked.load(std::memory_order_acquire); }

  /// Whether the user has answered: pressed one of the two buttons.
  void userHasAnswered() { _userAnswered.store(true, std::memory_order_release); }
  bool isAnsweredByUser() const { return _userAnswered.load(std::memory_order_acquire); }

  /// An alert of the operation ended without an answer: it was closed or taken down, or there was nobody to ask.
  void alertWentUnanswered() { _wentUnanswered.store(true, std::memory_order_release); }
  bool isLeftUnanswered() const { return isWithdrawn() || _wentUnanswered.load(std::memory_order_acquire); }

  /// A step of the operation could not be stored, or its user is not to be asked: whatever its plug-in answers, it has failed.
  /// The first failure counts.
  void fail(const BusFailure& failure);
  std::optional<BusFailure> failure() const;

 private:
  friend class OperationScope;

  std::function<void()> _beforeFirstWait;
  const std::optional<Intent> _grant;
  std::atomic<bool> _isWithdrawn = false;
  std::atomic<bool> _userAsked = false;
  std::atomic<bool> _userAnswered = false;
  std::atomic<bool> _wentUnanswered = false;
  mutable std::mutex _mutex;
  std::set<std::shared_ptr<const std::function<void()>>> _interrupts;
  std::optional<BusFailure> _failure;
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
