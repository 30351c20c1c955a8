#pragma once

/// Identifies callers whose connection is still theirs.

#include <unistd.h>

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

#include "Host/Identity/ClientRegistry.h"
#include "Tests/Host/Identity/CallerProcess.h"

/// A connection that the process has made, on a bus that this process holds.
inline palisade::CallingConnection connectionOf(pid_t process) {
  return {.process = process,
          .user = geteuid(),
          .busProcess = getpid(),
          .existedAt = UINT64_MAX,
          .askProcessAgain = [process] { return process; },
          .listConnections = [](std::uint64_t) { return std::vector<std::string>(); },
          .awaitEnd = [](const std::vector<std::string>& connections, auto) { return connections; },
          .confirm = [](const std::vector<std::string>&, std::uint64_t) {}};
}

inline std::shared_ptr<const palisade::RegisteredClient> identify(const palisade::ClientRegistry& registry, pid_t process) {
  return registry.identify(connectionOf(process));
}

/// As `identify`, with another answer when the bus is asked again.
inline std::shared_ptr<const palisade::RegisteredClient> identify(const palisade::ClientRegistry& registry, pid_t process,
                                                                  const std::function<pid_t()>& askProcessAgain) {
  auto connection = connectionOf(process);
  connection.askProcessAgain = askProcessAgain;
  return registry.identify(connection);
}

/// Why the caller is refused; empty when it is not.
inline std::string refusal(const palisade::ClientRegistry& registry, const palisade::CallingConnection& connection) {
  try {
    registry.identify(connection);
    return "";
  } catch (const palisade::IdentityError& error) {
    return error.what();
  }
}

inline std::string refusal(const palisade::ClientRegistry& registry, pid_t process) {
  return refusal(registry, connectionOf(process));
}
