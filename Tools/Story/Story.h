#pragma once

/// One application asks for the user's Facebook account, twice, and gives it back: the plug-in's decisions as a story.
///
/// The plug-in and its texts are real; the store, the keychain and the server around it are kept in memory.

#include <filesystem>
#include <iosfwd>

#include "Platform/SystemAlert.h"

namespace palisade {

/// Tells the story of the module in `pluginFolder` on `output`, asking the user on `alert`. Throws `PluginLoadError`, and
/// `std::runtime_error` when the module does something else than its story says.
void tellStory(const std::filesystem::path& module, SystemAlert& alert, std::ostream& output);

}  // namespace palisade
