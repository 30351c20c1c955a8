#include "Host/Identity/ConnectionOwner.h"

#include <unistd.h>

#include <chrono>
#include <cstddef>
#include <exception>
#include <limits>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "Host/Identity/BusSockets.h"

namespace palisade {
namespace {

// A child that was forked and has not run its program yet holds every connection of its parent for a moment, on a busy machine
// for many moments. Nobody waits for the refusal but the callers of this one process.
constexpr auto patience = std::chrono::seconds(2);

constexpr std::size_t everySocket = std::numeric_limits<std::size_t>::max();

std::string startAgain() { return " Start the application again."; }

void requireSameNumber(const CallingConnection& connection) {
  pid_t now = 0;
  try {
    now = connection.askProcessAgain();
  } catch (const std::exception& failure) {
    throw IdentityError(std::string("The bus no longer knows the caller's connection: ") + failure.what());
  }
  if (now != connection.process) {
    throw IdentityError("The caller's connection belonged to process " + std::to_string(connection.process) +
                        " and now to process " + std::to_string(now) + ".");
  }
}

void requireSameUser(const PinnedProcess& caller, const CallingConnection& connection) {
  if (connection.user != geteuid()) {
    throw IdentityError("The caller's connection belongs to another user (user ID " + std::to_string(connection.user) + ").");
  }
  if (const uid_t user = caller.user(); user != connection.user) {
    throw IdentityError("The caller's connection belongs to the user " + std::to_string(connection.user) +
                        " and its process to the user " + std::to_string(user) + ".");
  }
}

std::string_view labelAlone(std::string_view label) {
  label = label.substr(0, label.find_first_of(std::string_view("\n\0", 2)));
  if (label.ends_with(')')) label = label.substr(0, label.rfind(" ("));
  return label;
}

void requireSameLabel(const PinnedProcess& caller, const CallingConnection& connection) {
  if (!connection.securityLabel) return;
  const std::string now = caller.securityLabel().value_or("");
  if (isSameSecurityLabel(now, *connection.securityLabel)) return;
  throw NotItsConnection("The caller's connection was made by a process with the security label '" +
                         std::string(labelAlone(*connection.securityLabel)) + "', and its process has '" +
                         std::string(labelAlone(now)) + "'." + startAgain());
}

void requireNotYounger(std::uint64_t start, const CallingConnection& connection) {
  if (start <= connection.existedAt) return;
  throw NotItsConnection("The process that made the caller's connection has ended; another one has its number " +
                         std::to_string(connection.process) + " now." + startAgain());
}

// The sockets are always looked at after the connections were listed: a connection that is closed in between is then still
// counted, and its socket is not. Only the bus can end that, so only the end of a connection is waited for.
void requireEnoughSockets(const PinnedProcess& caller, std::uint64_t start, const CallingConnection& connection) {
  if (connection.ownerStart == start) return;
  const auto look = [&](std::size_t enough) {
    return socketsToBus(caller.folder(), connection.busAddress, connection.busProcess, enough);
  };
  const auto deadline = std::chrono::steady_clock::now() + patience;
  auto counted = connection.listConnections(start);
  auto held = look(counted.size());
  if (!held) {
    if (!connection.isOlderThanDaemon) return;
    throw NotItsConnection(
        "The caller's connection is older than the account daemon, and the kernel does not tell whose it is." + startAgain());
  }
  while (held->size() < counted.size()) {
    auto left = connection.awaitEnd(counted, deadline);
    if (left.size() == counted.size()) {
      throw NotItsConnection("The bus counts more connections for process " + std::to_string(connection.process) +
                             " than it has: the process that made one of them has ended, or another process keeps one that " +
                             "was closed." + startAgain());
    }
    counted = std::move(left);
    if (held->size() < counted.size()) continue;
    const auto heldNow = look(everySocket).value_or(std::set<SocketInode>());
    std::erase_if(*held, [&](SocketInode socket) { return !heldNow.contains(socket); });
  }
  connection.confirm(counted, start);
}

}  // namespace

PinnedProcess processBehind(const CallingConnection& connection) {
  return connection.pin != nullptr ? PinnedProcess(connection.pin) : PinnedProcess(connection.process);
}

bool isSameSecurityLabel(std::string_view one, std::string_view other) { return labelAlone(one) == labelAlone(other); }

void requireOwnConnection(const PinnedProcess& caller, const CallingConnection& connection) {
  if (connection.pin == nullptr) requireSameNumber(connection);
  requireSameUser(caller, connection);
  requireSameLabel(caller, connection);
  if (connection.pin != nullptr) return;
  const std::uint64_t start = caller.startTick();
  requireNotYounger(start, connection);
  requireEnoughSockets(caller, start, connection);
}

}  // namespace palisade
