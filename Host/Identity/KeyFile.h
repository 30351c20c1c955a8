#pragma once

/// The text form that desktop entries and Flatpak's instance files share: groups of `key=value` lines.
///
/// Threads: pure function. Errors: malformed text is none, as a whole; nobody guesses what half a file may have meant.

#include <functional>
#include <map>
#include <optional>
#include <string>
#include <string_view>

namespace palisade {

using KeyFileGroup = std::map<std::string, std::string, std::less<>>;
using KeyFile = std::map<std::string, KeyFileGroup, std::less<>>;

/// Groups by name, and in each the values by key; a localised key keeps its locale, as in "Name[de]". None when a line is
/// neither a comment, a group nor a key with a value, when a group or a key occurs twice, and when there is a zero byte.
std::optional<KeyFile> keyFileFromText(std::string_view text);

}  // namespace palisade
