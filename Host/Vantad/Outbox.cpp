#include "Host/Vantad/Outbox.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <stdexcept>
#include <utility>

#include "Host/Sqlite/Connections.h"
#include "Host/Sqlite/Statement.h"

namespace palisade {
namespace {

constexpr std::int32_t outboxApplicationID = 0x506c4f62;  // "PlOb" in ASCII

// A step that has been released never changes; a new one is put behind it. Dates are seconds since 1970, uptimes milliseconds.
constexpr std::array<std::string_view, 2> migrations{R"sql(
  CREATE TABLE invalidations (
    id INTEGER PRIMARY KEY AUTOINCREMENT,
    account_id TEXT NOT NULL,
    app_id TEXT NOT NULL,
    state TEXT NOT NULL DEFAULT 'pending' CHECK (state IN ('pending', 'confirmed', 'refused')),
    requested_at INTEGER NOT NULL,
    requested_boot TEXT NOT NULL,
    requested_uptime INTEGER NOT NULL,
    attempts INTEGER NOT NULL DEFAULT 0,
    last_attempt_at INTEGER,
    next_attempt_at INTEGER,
    held_by_server INTEGER NOT NULL DEFAULT 0 CHECK (held_by_server IN (0, 1)),
    last_error TEXT,
    settled_at INTEGER
  ) STRICT;
  CREATE INDEX invalidations_pending ON invalidations (id) WHERE state = 'pending';
)sql",
                                                     R"sql(
  CREATE TABLE departures (account_id TEXT PRIMARY KEY) STRICT, WITHOUT ROWID;
)sql"};

// A date that is none is read as -1.
constexpr std::string_view pendingQuery =
    "SELECT id, account_id, app_id, state, requested_at, requested_boot, requested_uptime, attempts,"
    " ifnull(last_attempt_at, -1), ifnull(next_attempt_at, -1), held_by_server, last_error, ifnull(settled_at, -1)"
    " FROM invalidations WHERE state = 'pending' ORDER BY id";

constexpr std::string_view latestQuery =
    "SELECT id, account_id, app_id, state, requested_at, requested_boot, requested_uptime, attempts,"
    " ifnull(last_attempt_at, -1), ifnull(next_attempt_at, -1), held_by_server, last_error, ifnull(settled_at, -1)"
    " FROM invalidations ORDER BY id DESC LIMIT ?1";

struct OutboxWriter {
  explicit OutboxWriter(Database& database)
      : add(database, "note an invalidation",
            "INSERT INTO invalidations (account_id, app_id, requested_at, requested_boot, requested_uptime)"
            " VALUES (?1, ?2, ?3, ?4, ?5)"),
        settle(database, "settle an invalidation",
               "UPDATE invalidations SET state = ?2, attempts = attempts + 1, last_attempt_at = ?3, next_attempt_at = NULL,"
               " held_by_server = 0, last_error = ?4, settled_at = ?3 WHERE id = ?1 AND state = 'pending'"),
        postpone(database, "postpone an invalidation",
                 "UPDATE invalidations SET attempts = attempts + 1, last_attempt_at = ?2, next_attempt_at = ?3,"
                 " held_by_server = ?4, last_error = ?5 WHERE id = ?1 AND state = 'pending'"),
        removeSettled(database, "forget settled invalidations",
                      "DELETE FROM invalidations WHERE state <> 'pending' AND settled_at < ?1"),
        noteDeparture(database, "note the removal of an account", "INSERT OR IGNORE INTO departures (account_id) VALUES (?1)"),
        forgetDeparture(database, "forget the removal of an account", "DELETE FROM departures WHERE account_id = ?1") {}

  Statement add;
  Statement settle;
  Statement postpone;
  Statement removeSettled;
  Statement noteDeparture;
  Statement forgetDeparture;
};

struct OutboxReader {
  explicit OutboxReader(Database& database)
      : pending(database, "list the pending invalidations", pendingQuery),
        latest(database, "list the invalidations", latestQuery),
        departures(database, "list the removed accounts", "SELECT account_id FROM departures ORDER BY account_id"),
        settledDepartures(
            database, "list the removed accounts that are settled",
            "SELECT account_id FROM departures WHERE NOT EXISTS (SELECT 1 FROM invalidations"
            " WHERE state = 'pending' AND invalidations.account_id = departures.account_id) ORDER BY account_id") {}

  Statement pending;
  Statement latest;
  Statement departures;
  Statement settledDepartures;
};

std::int64_t secondsOf(Date date) { return date.time_since_epoch().count(); }

Date dateOf(std::int64_t seconds) { return Date(std::chrono::seconds(seconds)); }

InvalidationState stateNamed(std::string_view name) {
  if (name == nameOf(InvalidationState::confirmed)) return InvalidationState::confirmed;
  return name == nameOf(InvalidationState::refused) ? InvalidationState::refused : InvalidationState::pending;
}

std::vector<Invalidation> readAll(Statement::Run run) {
  std::vector<Invalidation> entries;
  const auto optionalDate = [&run](int column) -> std::optional<Date> {
    const std::int64_t seconds = run.integer(column);
    return seconds < 0 ? std::nullopt : std::optional(dateOf(seconds));
  };
  while (run.next()) {
    entries.push_back({.id = run.integer(0),
                       .accountID = run.text(1),
                       .appID = run.text(2),
                       .state = stateNamed(run.text(3)),
                       .requested = {.date = dateOf(run.integer(4)),
                                     .boot = run.text(5),
                                     .uptime = std::chrono::milliseconds(run.integer(6))},
                       .attempts = run.integer(7),
                       .lastAttemptAt = optionalDate(8),
                       .nextAttemptAt = optionalDate(9),
                       .isHeldByServer = run.boolean(10),
                       .lastError = run.optionalText(11),
                       .settledAt = optionalDate(12)});
  }
  return entries;
}

std::vector<std::string> readTexts(Statement::Run run) {
  std::vector<std::string> texts;
  while (run.next()) texts.push_back(run.text(0));
  return texts;
}

}  // namespace

struct Outbox::Store : Connections<OutboxWriter, OutboxReader> {
  using Connections::Connections;
};

std::string_view nameOf(InvalidationState state) {
  switch (state) {
    case InvalidationState::pending: return "pending";
    case InvalidationState::confirmed: return "confirmed";
    case InvalidationState::refused: return "refused";
  }
  return {};
}

Outbox::Outbox(OutboxOptions options)
    : _options(std::move(options)),
      _bell(bellOf(_options.path)),
      _store(std::make_unique<Store>(Database::open({.path = _options.path,
                                                     .applicationID = outboxApplicationID,
                                                     .migrations = migrations,
                                                     .onDamage = _options.onDamage}))) {}

Outbox::~Outbox() = default;

const std::optional<std::filesystem::path>& Outbox::damagedStore() const { return _store->database().setAside(); }

void Outbox::add(std::string_view accountID, std::string_view appID) {
  const Moment now = _options.clock();
  _store->write([&](Database&, const OutboxWriter& writer) {
    writer.add.execute(accountID, appID, secondsOf(now.date), now.boot, now.uptime.count());
  });
  ring();
  if (_options.onAdd) _options.onAdd();
}

std::vector<Invalidation> Outbox::pending() {
  return _store->read([](const OutboxReader& reader) { return readAll(reader.pending.run()); });
}

std::vector<Invalidation> Outbox::latest(std::size_t limit) {
  return _store->read([limit](const OutboxReader& reader) { return readAll(reader.latest.run(limit)); });
}

void Outbox::confirm(std::int64_t id) {
  _store->write([&](Database&, const OutboxWriter& writer) {
    writer.settle.execute(id, nameOf(InvalidationState::confirmed), secondsOf(_options.clock().date),
                          std::optional<std::string_view>());
  });
}

void Outbox::refuse(std::int64_t id, std::string_view reason) {
  _store->write([&](Database&, const OutboxWriter& writer) {
    writer.settle.execute(id, nameOf(InvalidationState::refused), secondsOf(_options.clock().date), reason);
  });
}

void Outbox::postpone(std::int64_t id, Date nextAttempt, bool isHeldByServer, std::string_view reason) {
  _store->write([&](Database&, const OutboxWriter& writer) {
    writer.postpone.execute(id, secondsOf(_options.clock().date), secondsOf(nextAttempt), isHeldByServer, reason);
  });
}

void Outbox::removeSettledBefore(Date date) {
  _store->write([&](Database&, const OutboxWriter& writer) { writer.removeSettled.execute(secondsOf(date)); });
}

void Outbox::noteDeparture(std::string_view accountID) {
  _store->write([&](Database&, const OutboxWriter& writer) { writer.noteDeparture.execute(accountID); });
}

std::vector<std::string> Outbox::departures() {
  return _store->read([](const OutboxReader& reader) { return readTexts(reader.departures.run()); });
}

std::vector<std::string> Outbox::settledDepartures() {
  return _store->read([](const OutboxReader& reader) { return readTexts(reader.settledDepartures.run()); });
}

void Outbox::forgetDeparture(std::string_view accountID) {
  _store->write([&](Database&, const OutboxWriter& writer) { writer.forgetDeparture.execute(accountID); });
}

std::filesystem::path Outbox::bellOf(const std::filesystem::path& outbox) { return outbox.string() + ".bell"; }

void Outbox::ring() const noexcept {
  const int bell = open(_bell.c_str(), O_WRONLY | O_CREAT | O_CLOEXEC | O_NOFOLLOW, S_IRUSR | S_IWUSR);
  if (bell >= 0) close(bell);
}

}  // namespace palisade
