#pragma once

/// What the names of applications look like. Only names of these forms are recorded, matched or shown as an ID.
///
/// Threads: pure functions. Errors: none.

#include <string_view>

namespace palisade {

/// Two or more elements of letters, digits, '-' and '_', divided by dots: bundle IDs, and the IDs of Flatpak applications.
bool isApplicationID(std::string_view text);

/// Lower-case letters, digits and '-', and behind a '_' the key of an instance where one snap is installed several times.
bool isSnapName(std::string_view text);

}  // namespace palisade
