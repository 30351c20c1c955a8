#pragma once

/// What a desktop calls an application: the `Name` of its desktop entry.
///
/// Threads: safe from every thread, as long as nobody changes the environment at that moment. Errors: none; an entry that is
/// missing, unreadable, malformed or without a name is none.

#include <filesystem>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "Host/Identity/LocalizedText.h"

namespace palisade {

/// The name in all its languages, from the text of an entry.
std::optional<LocalizedText> nameInDesktopEntry(std::string_view text);

/// The folders that hold a user's shared data, most important first: XDG_DATA_HOME and XDG_DATA_DIRS, or their defaults.
std::vector<std::filesystem::path> dataFolders();

/// The name in the first entry of that file name ("org.example.photos.desktop") in the data folders.
std::optional<LocalizedText> nameInDesktopFile(const std::string& fileName);

}  // namespace palisade
