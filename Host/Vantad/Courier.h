#pragma once

/// Carries invalidations from the outbox to the Facebook server, one after another, until each is settled.
///
/// It signs each with the token of the account that asked, retries with growing pauses, and leaves the server alone for as long
/// as the server asks. What was sent twice because nobody heard the first answer does no harm.
/// Threads: every operation on the thread that made it, except that `onAnswer` is called on another one; it then asks for an
/// `advance` on the first. Ownership: borrows its parts. Destroying it abandons what is under way; the entry stays pending.
/// Errors: `SqliteError` from the outbox; everything else becomes an entry's reason to wait.

#include <chrono>
#include <cstdint>
#include <deque>
#include <functional>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "Host/Http/HttpClient.h"
#include "Host/Vantad/Moment.h"
#include "Host/Vantad/Outbox.h"
#include "Host/Vantad/RetryPolicy.h"
#include "Host/Vantad/Verdict.h"

namespace palisade {

class Account;
class FacebookServer;
class JsonParser;
class KeychainManager;
class Log;

class Courier {
 public:
  struct Parts {
    Outbox& outbox;
    HttpClient& http;
    const FacebookServer& server;
    KeychainManager& keychain;
    const JsonParser& json;
    Log& log;
    /// The account object by which the keychain knows an account.
    std::function<std::shared_ptr<Account>(const std::string& accountID)> account;
    std::function<void()> onAnswer;
    Clock clock = presentMoment;
    /// From 0 to 1.
    std::function<double()> random;
    RetryPolicy policy = {};
  };

  explicit Courier(Parts parts);
  Courier(const Courier&) = delete;
  Courier& operator=(const Courier&) = delete;
  ~Courier();

  /// Settles what has been answered and sends what is due. Answers after how long there is something to do again; none when
  /// only an answer, a new entry or `hurry` will bring that about.
  std::optional<std::chrono::milliseconds> advance();

  /// Makes everything due that waits for no wish of the server's: something has changed that may have been in the way.
  void hurry();

 private:
  struct Mailbox;

  std::optional<Date> collectDue();
  Date freeAgainAt(const std::vector<Invalidation>& pending, Date now) const;
  Date dueAt(const Invalidation& invalidation, Date now) const;
  void send(const Invalidation& invalidation);
  void settleUnderWay(const HttpResult& result);
  void settle(const Invalidation& invalidation, const Verdict& verdict);
  void postpone(const Invalidation& invalidation, const Verdict& verdict);

  // While every request would fail alike.
  struct Pause {
    Date from;
    Date until;
  };

  Parts _parts;
  std::shared_ptr<Mailbox> _mailbox;
  std::optional<Invalidation> _underWay;
  std::unique_ptr<HttpTransfer> _transfer;
  std::deque<Invalidation> _due;
  std::set<std::int64_t> _tried;  // since the last `hurry`; what has not been tried is due
  std::optional<Pause> _pause;
  bool _isHurried = false;  // since what is under way was sent
};

}  // namespace palisade
