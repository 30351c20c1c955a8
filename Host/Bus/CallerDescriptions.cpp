#include "Host/Bus/CallerDescriptions.h"

#include <exception>
#include <utility>

#include "Host/Bus/AccountsService.h"

namespace palisade {
namespace {

[[noreturn]] void failAsGone() { throw BusFailure(BusFailureKind::unknownCaller, "The caller has left the bus."); }

}  // namespace

CallerDescriptions::CallerDescriptions(std::string busAddress)
    : _busAddress(std::move(busAddress)),
      _connections([this](const std::string& uniqueName) { return _questions.processOf(uniqueName); }) {}

void CallerDescriptions::begin() {
  try {
    _busProcess = _questions.credentialsOf("org.freedesktop.DBus").process;
  } catch (const std::exception&) {
    // Callers that need it to be identified are refused.
  }
  _connections.wereThere(_questions.names());
}

pid_t CallerDescriptions::processOf(const std::string& uniqueName) {
  const auto process = _questions.processOf(uniqueName);
  if (!process) failAsGone();
  return *process;
}

CallingConnection CallerDescriptions::describe(const std::string& uniqueName) {
  const auto connection = _connections.find(uniqueName);
  if (!connection) failAsGone();
  BusCredentials credentials = _questions.credentialsOf(uniqueName);
  return {.process = credentials.process,
          .user = credentials.user,
          .pin = std::move(credentials.pin),
          .securityLabel = std::move(credentials.securityLabel),
          .busProcess = _busProcess,
          .busAddress = _busAddress,
          .existedAt = connection->existedAt,
          .isOlderThanDaemon = connection->isOlderThanDaemon,
          .askProcessAgain = [this, uniqueName] { return processOf(uniqueName); },
          .listConnections = [this, process = credentials.process](
                                 std::uint64_t sinceTick) { return _connections.madeBy(process, sinceTick); },
          .awaitEnd =
              [this](const std::vector<std::string>& connections, std::chrono::steady_clock::time_point deadline) {
                return _connections.awaitEnd(connections, deadline);
              },
          .ownerStart = connection->ownerStart,
          .confirm = [this](const std::vector<std::string>& connections,
                            std::uint64_t startTick) { _connections.confirm(connections, startTick); }};
}

}  // namespace palisade
