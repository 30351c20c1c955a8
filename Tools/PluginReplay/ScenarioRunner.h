#pragma once

/// Carries a scenario out against one module.
///
/// Threads: called once a process, by its only thread: what a module keeps for the life of the process starts fresh, and an
/// operation that waits for ever keeps its thread until the process ends. Ownership: `module` and `strings` outlive the
/// process. Errors: `std::runtime_error` when the module makes no plug-in object.

#include <memory>
#include <vector>

#include "Platform/AccountAccessPlugin.h"
#include "Platform/StringTable.h"
#include "Testing/Trace.h"
#include "Tools/PluginReplay/Scenario.h"

namespace palisade {

std::vector<Event> runScenario(const Scenario& scenario, const AccountAccessPluginModule& module,
                               std::shared_ptr<const StringTable> strings);

}  // namespace palisade
