#pragma once

/// Where the daemons keep their files, as the XDG base directories have it. Written once, here.
///
/// Threads: pure functions over the environment. Errors: `std::runtime_error` when the user has no home.

#include <filesystem>
#include <string>
#include <vector>

namespace palisade {

/// What the daemons write: stores, the vault, the outbox.
std::filesystem::path stateFolder();

/// What a person writes: server.toml, accountd.toml, preferences/DOMAIN.toml.
std::filesystem::path configurationFolder();

/// The person's own file of this name; the administrator's, below $XDG_CONFIG_DIRS, when the person has none. Where the
/// person's would stand when there is neither.
std::filesystem::path configurationFile(const std::string& name);

/// Client records: the administrator's, the user's own, the system's.
std::vector<std::filesystem::path> clientRecordFolders();

/// Where a client record can give entitlements, whatever the environment says.
std::vector<std::filesystem::path> systemClientRecordFolders();

}  // namespace palisade
