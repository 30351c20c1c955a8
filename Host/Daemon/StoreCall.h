#pragma once

/// What the store reports, as the failure that a caller of the bus is told.
///
/// Threads: plain functions. Ownership: none. Errors: `BusFailure` with `storeUnavailable`.

#include <optional>

#include "Host/Bus/AccountsService.h"
#include "Host/Sqlite/SqliteError.h"
#include "Platform/Error.h"

namespace palisade {

template <typename Call>
auto storeCall(const Call& call) {
  try {
    return call();
  } catch (const SqliteError& error) {
    throw BusFailure(BusFailureKind::storeUnavailable, error.what());
  }
}

inline void refuseUnlessStored(const std::optional<Error>& error) {
  if (error) throw BusFailure(BusFailureKind::storeUnavailable, error->description.value_or("The store refused."));
}

}  // namespace palisade
