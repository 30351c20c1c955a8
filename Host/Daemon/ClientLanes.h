#pragma once

/// Keeps the operations of one client in order, one at a time, and their number bounded; lets a revocation overtake them.
///
/// Threads: `enter` and both `hold`s block the calling thread until it may go on; `beforeWaiting` is called if there is
/// something to wait for. Ownership: a turn or a hold ends when its object goes away. Errors: `LaneIsFull` when a client has
/// too many operations; whoever throws in `beforeWaiting` gives its place up.

#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <deque>
#include <functional>
#include <map>
#include <mutex>
#include <set>
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

  /// What an operation or a revocation has of the lanes, until it ends.
  class Place {
   public:
    explicit Place(std::function<void()> leave) : _leave(std::move(leave)) {}
    Place(const Place&) = delete;
    Place& operator=(const Place&) = delete;
    ~Place() { end(); }

    /// Ends it before the object does. From any thread, but not from two at once.
    void end() {
      if (const auto leave = std::exchange(_leave, nullptr)) leave();
    }

   private:
    std::function<void()> _leave;
  };

  /// The client's turn.
  [[nodiscard]] Place enter(const std::string& client, const std::function<void()>& beforeWaiting);

  /// Lets none of the client's operations begin. The one whose turn it is goes on, and is not waited for; another hold is.
  [[nodiscard]] Place hold(const std::string& client);

  /// The same for every client.
  [[nodiscard]] Place holdAll();

 private:
  /// The tickets of one client's operations; the first one's turn it is.
  using Lane = std::deque<std::uint64_t>;

  bool isHeld(const std::string& client) const { return _allAreHeld || _held.contains(client); }
  void leave(const std::string& client, std::uint64_t ticket);

  const std::size_t _longest;
  std::mutex _mutex;
  std::condition_variable _hasMoved;
  std::map<std::string, Lane> _lanes;
  std::uint64_t _nextTicket = 0;
  std::set<std::string> _held;
  /// Somebody holds all clients, or waits for it: nobody else's hold begins, and no operation.
  bool _allAreHeld = false;
};

}  // namespace palisade
