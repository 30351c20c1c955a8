#pragma once

/// Whose display the window would be shown by.
///
/// Threads: GTK's one. Errors: a display of which that cannot be told is nobody's to trust.

#include <gdk/gdk.h>

#include <string>

namespace palisade {

/// Whether the display server at the other end of GTK's own connection belongs to this user or to root, or is the one that is
/// reached over the network as `networkDisplay`.
bool isTrustedDisplay(GdkDisplay* display, const std::string& networkDisplay);

}  // namespace palisade
