#pragma once

/// Reads the answers of a scenario's user, server and store. Threads and errors: see `ScenarioReader`.

#include <optional>
#include <vector>

#include "Platform/Error.h"
#include "Testing/Deliveries.h"
#include "Testing/FakeSystemAlert.h"
#include "Tools/PluginReplay/JsonPlace.h"

namespace palisade {

std::optional<Error> readErrorOrNull(const JsonPlace& place);

/// A list, or one object for a list of one.
std::vector<AlertAnswer> readAlertAnswers(const JsonPlace& place);

std::vector<ServerAnswer> readServerAnswers(const JsonPlace& place);

}  // namespace palisade
