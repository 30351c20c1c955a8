#pragma once

/// Carries out one scenario after the other, several at once, and writes the results in the order of the scenarios.
///
/// Threads: called by the only thread of the process. It holds the text of a few scenarios and the results that wait for an
/// earlier one, however long the input is; a result is written as soon as all earlier ones are.
/// Errors: `std::system_error` when the input cannot be read or no process can be started.

#include <cstddef>
#include <iosfwd>

#include "Tools/PluginReplay/ScenarioProcess.h"

namespace palisade {

/// The worst of all outcomes.
ScenarioOutcome runBatch(int inputDescriptor, std::ostream& output, std::size_t atOnce, const CarryOut& carryOut);

}  // namespace palisade
