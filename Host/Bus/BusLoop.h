#pragma once

/// Reads the bus, and carries out on the same thread what a message asks for: leader and followers.
///
/// One thread, the leader, waits for messages. Work that finds everything it needs in memory runs on the leader itself, so an
/// answer that needs nobody changes no thread. Work that may wait (for a user, a server, a keychain, a disk) calls `handOver`
/// before it does: another thread becomes the leader and goes on reading, and the first one comes back as a follower when its
/// work is done. How many threads wait is the callers' care: see `WaitingCalls` and `ClientLanes`. A work that waits for a day
/// delays nobody. Work that throws has failed alone, and so has a message that cannot be read: the loop goes on. Threads: `run`
/// is called once and returns after `stop`; `defer` is called from message handlers; `handOver`, `wake` and `stop` from
/// anywhere. Ownership: borrows the connection. Errors: a lost connection ends `run` with an exception; `onTrouble` is told
/// everything else, on the thread that meets it.

#include <condition_variable>
#include <cstddef>
#include <deque>
#include <functional>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

namespace sdbus {
class IConnection;
}

namespace palisade {

class BusLoop {
 public:
  BusLoop(sdbus::IConnection& connection, std::function<void(const std::string&)> onTrouble);
  ~BusLoop();

  BusLoop(const BusLoop&) = delete;
  BusLoop& operator=(const BusLoop&) = delete;

  /// Reads and works until `stop`; then waits for the work under way.
  void run();

  void stop();

  /// Has `work` run by this thread when the message handler has returned.
  static void defer(std::function<void()> work);

  /// Has `work` run by the leader as soon as it has done what it does now.
  void post(std::function<void()> work);

  /// Lets another thread read the bus, after it has run `first`. Any thread but the leader runs `first` itself, and that is
  /// all. A `BusFailure` when there is no such thread: this one is the leader then as before.
  static void handOver(std::function<void()> first = [] {});

  /// Has the leader look at the connection again: there may be something to send.
  void wake();

 private:
  void serve();
  void lead();
  void readOnce();
  void carryOutPosted();
  bool processNext();
  void carryOut(const std::function<void()>& work);
  void waitForMessages();
  void giveUpLead(std::function<void()> first);
  void addFollower();

  sdbus::IConnection& _connection;
  const std::function<void(const std::string&)> _onTrouble;
  int _wakeUp;

  std::mutex _mutex;
  std::condition_variable _leadIsFree;
  std::vector<std::thread> _followers;
  std::deque<std::function<void()>> _posted;
  std::size_t _parked = 0;
  bool _hasLeader = false;
  bool _isStopping = false;
  std::exception_ptr _failure;
};

}  // namespace palisade
