#pragma once

/// Keeps the operations of one client in order, one at a time, and their number bounded.
///
/// Threads: both `enter`s block the calling thread until its turn has come; `beforeWaiting` is called if there is something to
/// wait for. Ownership: a turn ends when its object goes away. Errors: `LaneIsFull` when a client has too many operations;
/// whoever throws in `beforeWaiting` gives its turn up.

#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <functional>
#include <map>
#include <mutex>
#include <optional>
#include <stdexcept>
#include <string>
#include <utility>

namespace palisade {

class LaneIsFull : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

class ClientLanes {
 public:
  explicit ClientLanes(std::size_t longest) : _longest(longest) {}

  class Turn {
   public:
    /// Of one client, or of all of them.
    Turn(ClientLanes& lanes, std::optional<std::string> client) : _lanes(lanes), _client(std::move(client)) {}
    Turn(const Turn&) = delete;
    Turn& operator=(const Turn&) = delete;
    ~Turn() { end(); }

    /// Ends it before the object does. From any thread, but not from two at once.
    void end() {
      if (!std::exchange(_isOver, true)) _lanes.leave(_client);
    }

   private:
    ClientLanes& _lanes;
    std::optional<std::string> _client;
    bool _isOver = false;
  };

  enum class Bound {
    kept,    ///< refused when the client's lane is full
    waived,  ///< never refused: a revocation, say
  };

  /// The client's turn.
  [[nodiscard]] Turn enter(const std::string& client, Bound bound, const std::function<void()>& beforeWaiting);

  /// Everybody's turn: no operation of any client runs beside it.
  [[nodiscard]] Turn enterAll(const std::function<void()>& beforeWaiting);

 private:
  /// The tickets of one client's operations; the first one's turn it is.
  using Lane = std::deque<std::uint64_t>;

  void giveUp(const std::string& client, std::uint64_t ticket);
  void leave(const std::optional<std::string>& client);
  void waitUntil(std::unique_lock<std::mutex>& lock, const std::function<void()>& beforeWaiting,
                 const std::function<bool()>& isTrue);

  const std::size_t _longest;
  std::mutex _mutex;
  std::condition_variable _hasMoved;
  std::map<std::string, Lane> _lanes;
  std::uint64_t _nextTicket = 0;
  /// Operations whose turn it is.
  std::size_t _active = 0;
  /// Somebody has, or waits for, everybody's turn: nobody else's begins.
  bool _isTakenByOne = false;
};

}  // namespace palisade
