#pragma once

/// Identifies callers whose connection is still theirs.

#include "Host/Identity/ClientRegistry.h"
#include "Tests/Host/Identity/CallerProcess.h"

inline std::shared_ptr<const palisade::RegisteredClient> identify(const palisade::ClientRegistry& registry, pid_t process) {
  return registry.identify(process, [process] { return process; });
}

/// Why the caller is refused; empty when it is not.
inline std::string refusal(const palisade::ClientRegistry& registry, pid_t process) {
  try {
    identify(registry, process);
    return "";
  } catch (const palisade::IdentityError& error) {
    return error.what();
  }
}
