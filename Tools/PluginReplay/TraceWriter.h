#pragma once

/// Writes what came of a scenario as JSON on one line. Threads: all functions are pure. Errors: none.

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "Testing/Trace.h"

namespace palisade {

/// `{"scenario": id, "events": [...]}`, with the platform's constants by name.
std::string writeTrace(const std::optional<std::string>& scenarioID, const std::vector<Event>& events);

/// `{"scenario": id, "error": text}`.
std::string writeScenarioError(const std::optional<std::string>& scenarioID, std::string_view text);

/// `{"scenario": id, "crash": signal}`.
std::string writeCrash(const std::optional<std::string>& scenarioID, int signal);

}  // namespace palisade
