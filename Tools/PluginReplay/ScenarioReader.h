#pragma once

/// Reads a scenario out of its JSON value and refuses everything that is not of the form.
///
/// Threads: all functions are pure. Errors: `ScenarioError`, whose text says which member is wrong, where, and why.

#include <optional>
#include <string>

#include "Tools/PluginReplay/JsonPlace.h"
#include "Tools/PluginReplay/Scenario.h"

namespace palisade {

/// The scenario's `id` when it has one that is a text, also when the rest of it is not of the form.
std::optional<std::string> scenarioID(const Value& document);

Scenario readScenario(const Value& document);

}  // namespace palisade
