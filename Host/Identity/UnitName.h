#pragma once

/// Which application a systemd unit was started for, by the names that desktop environments agreed on: scopes and slices
/// `app[-LAUNCHER]-ID-RANDOM`, services `app[-LAUNCHER]-ID[@RANDOM]` and `app[-LAUNCHER]-ID-autostart`.
///
/// Threads: pure function. Errors: none.

#include <optional>
#include <string>
#include <string_view>

namespace palisade {

/// The application's ID, with its escaped characters restored; none for units that are named otherwise.
std::optional<std::string> applicationOfUnit(std::string_view unit);

}  // namespace palisade
