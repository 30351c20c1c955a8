#pragma once

/// The invalidations that the Facebook server has yet to carry out, and those that it has settled: what the account daemon
/// writes, the social daemon carries out, and people are shown.
///
/// An entry names the account that asks and the app whose token is taken back. It never holds a token, nor a word that a server
/// said, since a server may repeat what it was sent.
/// Threads: every operation may be called from any thread; several processes may have the outbox open. Ownership: owns its
/// connections to the store. Errors: `SqliteError`; after one nothing has changed. What an operation has stored when it
/// returns survives a power cut.

#include <chrono>
#include <cstdint>
#include <filesystem>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "Host/Sqlite/Database.h"
#include "Host/Vantad/Moment.h"

namespace palisade {

enum class InvalidationState {
  pending,    ///< the server has not answered yet that the token is invalid
  confirmed,  ///< the token is invalid, or the server knows of none
  refused     ///< it cannot or will not be done, and asking again does not help
};

/// "pending", "confirmed", "refused".
std::string_view nameOf(InvalidationState state);

struct Invalidation {
  std::int64_t id = 0;
  std::string accountID;
  std::string appID;
  InvalidationState state = InvalidationState::pending;
  Moment requested;
  std::int64_t attempts = 0;
  std::optional<Date> lastAttemptAt;
  /// None: at once.
  std::optional<Date> nextAttemptAt;
  /// Whether the server itself asked to be left alone until `nextAttemptAt`.
  bool isHeldByServer = false;
  /// A sentence for people.
  std::optional<std::string> lastError;
  std::optional<Date> settledAt;
};

struct OutboxOptions {
  std::filesystem::path path;
  DamagedStore onDamage = DamagedStore::refuse;
  Clock clock = presentMoment;
  /// Called when something has been added, on the thread that added it.
  std::function<void()> onAdd = nullptr;
};

class Outbox {
 public:
  explicit Outbox(OutboxOptions options);
  ~Outbox();

  /// Where the damaged store went that this one replaces, if any.
  const std::optional<std::filesystem::path>& damagedStore() const;

  /// Writes down that the app's token is to be made invalid, and wakes the social daemon.
  void add(std::string_view accountID, std::string_view appID);

  /// In the order in which they were added.
  std::vector<Invalidation> pending();

  /// The latest entries in every state, the latest first.
  std::vector<Invalidation> latest(std::size_t limit);

  /// \name Removed accounts, whose own tokens the entries still need
  ///@{
  void noteDeparture(std::string_view accountID);
  std::vector<std::string> departures();
  /// Those for which no entry is pending.
  std::vector<std::string> settledDepartures();
  void forgetDeparture(std::string_view accountID);
  ///@}

  /// \name For the social daemon. An entry that has been settled already stays as it is.
  ///@{
  void confirm(std::int64_t id);
  void refuse(std::int64_t id, std::string_view reason);
  void postpone(std::int64_t id, Date nextAttempt, bool isHeldByServer, std::string_view reason);
  void removeSettledBefore(Date date);
  ///@}

  /// The file that is written each time something is added, beside the store. Whoever waits for entries watches its folder, and
  /// looks once after the watch has begun. (The store's own files change before what changed can be read.)
  static std::filesystem::path bellOf(const std::filesystem::path& outbox);

  /// Wakes the social daemon. Does not fail: entries wait for it to start, or for the next ring.
  void ring() const noexcept;

 private:
  struct Store;

  const OutboxOptions _options;
  const std::filesystem::path _bell;
  const std::unique_ptr<Store> _store;
};

}  // namespace palisade
