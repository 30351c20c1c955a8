#include "Host/Vantad/Courier.h"

#include <algorithm>
#include <exception>
#include <mutex>
#include <utility>

#include "Host/Social/FacebookServer.h"
#include "Platform/Account.h"
#include "Platform/KeychainManager.h"
#include "Platform/Log.h"

namespace palisade {
namespace {

constexpr const char* settleOperation = "Courier::settle";

}  // namespace

// Where the handler leaves the answer; it may outlive the courier.
struct Courier::Mailbox {
  void put(HttpResult result) {
    const std::lock_guard lock(mutex);
    answer = std::move(result);
  }

  std::optional<HttpResult> take() {
    const std::lock_guard lock(mutex);
    return std::exchange(answer, std::nullopt);
  }

  std::mutex mutex;
  std::optional<HttpResult> answer;
};

Courier::Courier(Parts parts) : _parts(std::move(parts)), _mailbox(std::make_shared<Mailbox>()) {}

Courier::~Courier() = default;

std::optional<std::chrono::milliseconds> Courier::advance() {
  if (std::optional<HttpResult> answer = _mailbox->take()) settleUnderWay(*answer);
  while (!_underWay) {
    if (_due.empty()) {
      const std::optional<Date> next = collectDue();
      if (!next) return std::nullopt;
      if (_due.empty()) return *next - _parts.clock().date;
    }
    const Invalidation invalidation = std::move(_due.front());
    _due.pop_front();
    send(invalidation);
  }
  return std::nullopt;
}

void Courier::hurry() {
  _isHurried = _underWay.has_value();
  _tried.clear();
  _due.clear();
  _pause.reset();
}

std::optional<Date> Courier::collectDue() {
  const Date now = _parts.clock().date;
  const std::vector<Invalidation> pending = _parts.outbox.pending();
  if (pending.empty()) return std::nullopt;

  const Date free = freeAgainAt(pending, now);
  Date next = Date::max();
  for (const Invalidation& invalidation : pending) {
    const Date due = std::max(free, dueAt(invalidation, now));
    next = std::min(next, due);
    if (due <= now) _due.push_back(invalidation);
  }
  return next;
}

// A time that was noted in the future says that the clock has been put back: what follows from it is not waited for.
Date Courier::freeAgainAt(const std::vector<Invalidation>& pending, Date now) const {
  Date free = _pause && _pause->from <= now ? _pause->until : now;
  for (const Invalidation& invalidation : pending) {
    if (invalidation.isHeldByServer && invalidation.lastAttemptAt <= now) {
      free = std::max(free, invalidation.nextAttemptAt.value_or(now));
    }
  }
  return free;
}

Date Courier::dueAt(const Invalidation& invalidation, Date now) const {
  if (!invalidation.nextAttemptAt || invalidation.lastAttemptAt > now) return now;
  if (!invalidation.isHeldByServer && !_tried.contains(invalidation.id)) return now;
  return *invalidation.nextAttemptAt;
}

void Courier::send(const Invalidation& invalidation) {
  _tried.insert(invalidation.id);
  std::optional<std::string> token;
  try {
    const auto credential = _parts.keychain.credentialForAccount(_parts.account(invalidation.accountID), std::nullopt);
    if (credential != nullptr) token = credential->oauthToken();
  } catch (const std::exception& error) {
    settle(invalidation, {.sentence = error.what()});
    return;
  }
  if (!token || token->empty()) {
    settle(invalidation, {.kind = Verdict::Kind::refused,
                          .sentence = "There is no token to sign the request with any more: the account has been removed."});
    return;
  }

  // How old the wish is tells the server which tokens it means: one that was issued before it must not seem to be younger.
  // After a restart of the machine nobody knows: it means all.
  const auto age = elapsed(invalidation.requested, _parts.clock()).value_or(std::chrono::milliseconds(0));
  _underWay = invalidation;
  _transfer = _parts.http.send(_parts.server.invalidation(invalidation.appID, age, token),
                               [mailbox = _mailbox, onAnswer = _parts.onAnswer](HttpResult result) {
                                 mailbox->put(std::move(result));
                                 onAnswer();
                               });
}

void Courier::settleUnderWay(const HttpResult& result) {
  _transfer.reset();
  const Invalidation invalidation = *std::exchange(_underWay, std::nullopt);
  settle(invalidation, judge(result, _parts.json));
  // What has changed meanwhile may have been in the way of this attempt too.
  if (_isHurried) hurry();
}

void Courier::settle(const Invalidation& invalidation, const Verdict& verdict) {
  switch (verdict.kind) {
    case Verdict::Kind::confirmed:
      _parts.outbox.confirm(invalidation.id);
      _parts.log.record(settleOperation, LogLevel::notice, "The token of app %@ is invalid.", "appID", invalidation.appID);
      break;
    case Verdict::Kind::refused:
      _parts.outbox.refuse(invalidation.id, verdict.sentence);
      _parts.log.record(settleOperation, LogLevel::error, "The token of app %@ stays valid. %@", "appID, reason",
                        invalidation.appID, verdict.sentence);
      break;
    case Verdict::Kind::tryAgain: postpone(invalidation, verdict); break;
    case Verdict::Kind::untried: break;
  }
}

void Courier::postpone(const Invalidation& invalidation, const Verdict& verdict) {
  const Date now = _parts.clock().date;
  const std::chrono::seconds wait = verdict.retryAfter ? _parts.policy.asked(*verdict.retryAfter)
                                                       : _parts.policy.after(invalidation.attempts + 1, _parts.random());
  _parts.log.record(settleOperation, LogLevel::notice, "The token of app %@ is still valid; trying again in %d s. %@",
                    "appID, seconds, reason", invalidation.appID, static_cast<std::size_t>(wait.count()), verdict.sentence);
  if (verdict.concernsServer) {
    _pause = Pause{.from = now, .until = now + wait};
    _due.clear();
  }
  _parts.outbox.postpone(invalidation.id, now + wait, verdict.retryAfter.has_value(), verdict.sentence);
}

}  // namespace palisade
