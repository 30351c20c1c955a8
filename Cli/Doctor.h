#pragma once

/// `palisade doctor`: what Palisade runs on in this session, looked at piece by piece, and what to do about each trouble.
///
/// Threads: one. Errors: none; what cannot be examined is a finding too.

#include "Cli/Output.h"

namespace palisade {

/// Prints the findings and answers the exit status: 0 all is well, 1 something is amiss, 2 something does not work.
int examine(const Output& output);

}  // namespace palisade
