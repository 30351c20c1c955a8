#pragma once

/// Answers a request in the way that a fault asks for.
///
/// Threads: the one that serves the connection; it may be kept for as long as the client holds the connection. Errors: none.

#include <string>

#include "Sandbox/Faults.h"
#include "Sandbox/RawConnection.h"

namespace palisade::sandbox {

/// `answer` is the whole proper answer, head and body; a fault that is a proper answer itself writes just that.
void answerWithFault(const Fault& fault, const std::string& answer, RawConnection& connection);

}  // namespace palisade::sandbox
