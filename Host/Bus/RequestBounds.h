#pragma once

/// How much a caller may send, and how much of what is stored is sent back: the daemon keeps, shows and passes on what its
/// callers bring, so each value has a bound, whatever the plug-in would make of it.
///
/// A dictionary's own bound is kept where it is read (DBus/BusValue.h).
/// Threads: pure functions. Errors: what is beyond its bound is a `BusFailure` that names the value and the bound.

#include <cstddef>
#include <string_view>

#include "Platform/Value.h"

namespace palisade {

/// In bytes: account types, account IDs, user names, preferences, app IDs, audiences.
inline constexpr std::size_t longestName = 256;
/// A program without a record is known by its path.
inline constexpr std::size_t longestClientID = 4096;
inline constexpr std::size_t longestPermission = 128;
inline constexpr std::size_t mostPermissions = 200;

void requireName(std::string_view argument, std::string_view text);
void requireClientID(std::string_view argument, std::string_view text);

/// What an application asks for.
void requireBoundedAccessOptions(const Dictionary& options);

/// A row as it is listed: texts and lists beyond the bounds are cut and end with "…". A row that was stored without bounds then
/// fits into a message like any other.
Dictionary shortenedRow(const Dictionary& row);

}  // namespace palisade
