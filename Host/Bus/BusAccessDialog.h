#pragma once

/// A question to a portal's backend on the session bus (org.freedesktop.impl.portal.Access).
///
/// Each question has a connection of its own, which only the thread that waits for the reply reads: no other thread waits, and
/// what the backend does can disturb nobody else. A reply counts when it answers this very call, comes from the owner of the
/// name that was asked, and is of the right form. If that owner leaves the bus or loses the name, nobody has answered.
/// Threads: see `AccessDialog`. Errors: see there; a name that cannot be looked up is not reachable.

#include <memory>
#include <string>

#include "Host/Alert/AccessDialog.h"
#include "Host/Alert/AccessQuestion.h"

namespace palisade {

/// Whether a program has that name on the session bus, or can be started for it.
bool isOnSessionBus(const std::string& name);

/// Asks the backend of that bus name, which the bus starts if need be; returns at once. How long it has had the question counts
/// from the wait for its reply, which comes next. Null when the bus cannot be reached.
std::unique_ptr<AccessDialog> openAccessDialog(const std::string& backend, const AccessQuestion& question);

}  // namespace palisade
