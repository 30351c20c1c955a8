#pragma once

/// An application as an alert shows it.
///
/// Threads: a pure function. Errors: none.

#include "Host/Alert/AlertQuestion.h"
#include "Host/Identity/RegisteredClient.h"

namespace palisade {

/// `client` is the one that asks, and not what a record says about its ID: one record can let in callers of which more is known
/// than of others. The account is left out.
AlertSubject subjectOf(const RegisteredClient& client);

}  // namespace palisade
