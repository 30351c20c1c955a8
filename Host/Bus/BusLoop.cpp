#include "Host/Bus/BusLoop.h"

#include <poll.h>
#include <sdbus-c++/Error.h>
#include <sdbus-c++/IConnection.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <cerrno>
#include <exception>
#include <iterator>
#include <system_error>
#include <utility>

#include "Host/Bus/AccountsService.h"
#include "Host/Secrets/Wipe.h"

namespace palisade {
namespace {

// What the library calls a message that breaks its rules. It has passed over the message when it says so.
constexpr const char* unreadableMessage = "org.freedesktop.DBus.Error.InconsistentMessage";

// The loop that this thread leads, or null.
thread_local BusLoop* ledLoop = nullptr;
thread_local std::vector<std::function<void()>> deferredWork;

}  // namespace

BusLoop::BusLoop(sdbus::IConnection& connection, std::function<void(const std::string&)> onTrouble)
    : _connection(connection),
      _onTrouble(std::move(onTrouble)),
      _wakeUp(eventfd(0, EFD_CLOEXEC | EFD_NONBLOCK)) {
  if (_wakeUp < 0) throw std::system_error(errno, std::generic_category(), "No event descriptor for the bus loop");
}

BusLoop::~BusLoop() { ::close(_wakeUp); }

void BusLoop::run() {
  serve();
  std::vector<std::thread> followers;
  {
    const std::lock_guard lock(_mutex);
    followers.swap(_followers);
    _posted.clear();
  }
  for (std::thread& follower : followers) follower.join();
  if (_failure != nullptr) std::rethrow_exception(_failure);
}

void BusLoop::stop() {
  // All of it under the lock: as soon as that is free, `run` may return and the loop be gone.
  const std::lock_guard lock(_mutex);
  _isStopping = true;
  _leadIsFree.notify_all();
  wake();
}

void BusLoop::wake() { eventfd_write(_wakeUp, 1); }

void BusLoop::defer(std::function<void()> work) { deferredWork.push_back(std::move(work)); }

void BusLoop::post(std::function<void()> work) {
  {
    const std::lock_guard lock(_mutex);
    _posted.push_back(std::move(work));
  }
  wake();
}

void BusLoop::handOver(std::function<void()> first) {
  if (ledLoop == nullptr) return first();
  ledLoop->giveUpLead(std::move(first));
}

void BusLoop::giveUpLead(std::function<void()> first) {
  const std::lock_guard lock(_mutex);
  if (!_isStopping) {
    if (_parked == 0) addFollower();
    _posted.push_front(std::move(first));
    _leadIsFree.notify_one();
  }
  _hasLeader = false;
  ledLoop = nullptr;
}

void BusLoop::addFollower() {
  try {
    _followers.emplace_back([this] { serve(); });
  } catch (const std::system_error&) {
    throw BusFailure(BusFailureKind::tooManyRequests, "There is no thread left for this call. Try again later.");
  }
}

void BusLoop::serve() {
  std::unique_lock lock(_mutex);
  while (!_isStopping) {
    if (_hasLeader) {
      ++_parked;
      _leadIsFree.wait(lock, [&] { return !_hasLeader || _isStopping; });
      --_parked;
      continue;
    }
    _hasLeader = true;
    lock.unlock();
    lead();
    lock.lock();
  }
}

// Returns when this thread is no longer the leader: its work handed the lead over, or the loop stops.
void BusLoop::lead() {
  ledLoop = this;
  try {
    while (ledLoop == this) readOnce();
  } catch (...) {
    {
      const std::lock_guard lock(_mutex);
      if (_failure == nullptr) _failure = std::current_exception();
    }
    stop();
    ledLoop = nullptr;
  }
}

void BusLoop::readOnce() {
  carryOutPosted();
  if (ledLoop != this) return wake();
  const bool mayHoldMore = processNext();
  const bool hadWork = !deferredWork.empty();
  for (const auto& work : std::exchange(deferredWork, {})) carryOut(work);
  if (ledLoop != this) {
    // What this thread answered may wait to be sent; only the leader watches for that.
    wake();
    return;
  }
  if (!mayHoldMore && !hadWork) waitForMessages();
}

// What is left when one of them hands the lead over is the next leader's.
void BusLoop::carryOutPosted() {
  while (ledLoop == this) {
    std::function<void()> work;
    {
      const std::lock_guard lock(_mutex);
      if (_posted.empty()) return;
      work = std::move(_posted.front());
      _posted.pop_front();
    }
    carryOut(work);
  }
}

bool BusLoop::processNext() {
  try {
    return _connection.processPendingRequest();
  } catch (const sdbus::Error& error) {
    if (error.getName() != unreadableMessage) throw;
    _onTrouble("A message that cannot be read was passed over: " + error.getMessage());
    return true;
  }
}

// What one caller asks for must not cost the others the daemon. Where the connection itself is lost, reading says so.
void BusLoop::carryOut(const std::function<void()>& work) {
  try {
    work();
  } catch (const std::exception& failure) {
    _onTrouble(std::string("What a call asked for was cut short: ") + failure.what());
  }
  wipeDeadStack();
}

void BusLoop::waitForMessages() {
  {
    const std::lock_guard lock(_mutex);
    if (_isStopping) {
      ledLoop = nullptr;
      return;
    }
  }
  const auto bus = _connection.getEventLoopPollData();
  pollfd sources[] = {{.fd = bus.fd, .events = bus.events, .revents = 0}, {.fd = _wakeUp, .events = POLLIN, .revents = 0}};
  if (poll(sources, std::size(sources), bus.getPollTimeout()) < 0 && errno != EINTR) {
    throw std::system_error(errno, std::generic_category(), "Waiting for the bus failed");
  }
  if (sources[1].revents != 0) {
    eventfd_t count = 0;
    eventfd_read(_wakeUp, &count);
  }
}

}  // namespace palisade
