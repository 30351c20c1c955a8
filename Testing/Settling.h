#pragma once

/// Runs pieces of work on threads of their own and tells when nothing in the process moves any more.
///
/// At rest is: every thread that was started here has finished or waits endlessly, and every queue has done its work. Nothing
/// happens from then on until the caller does something. Threads that a test or a plug-in starts itself are not seen.
/// Threads: used by one thread at a time. Ownership: a worker that waits for ever is remembered as long as the process lives,
/// because later work may wake it.

#include <functional>
#include <memory>

#include "Testing/Worker.h"

namespace palisade {

/// Starts `work` and comes back when everything is at rest.
std::shared_ptr<const Worker> runUntilAtRest(ThreadLabel label, std::function<void()> work);

}  // namespace palisade
