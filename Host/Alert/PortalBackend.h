#pragma once

/// Which program of the session asks access questions for its portal.
///
/// A desktop installs one backend or several, each with a file NAME.portal that says what it serves, and says in portals.conf,
/// or NAME-portals.conf for the desktop of that name, which of them it prefers (portals.conf(5)). Both are looked for as the
/// session's own portal does, so that its user sees the same dialogs from everybody.
/// Threads: safe from every thread, as long as nobody changes the environment at that moment. Errors: none; a file that is
/// missing or malformed is passed over.

#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace palisade {

inline constexpr std::string_view accessInterface = "org.freedesktop.impl.portal.Access";

/// The session's desktops, most special first, in small letters: XDG_CURRENT_DESKTOP.
std::vector<std::string> currentDesktops();

/// The bus name of the backend that is to serve access questions; none when there is none, or none is wanted.
std::optional<std::string> accessBackend();

}  // namespace palisade
