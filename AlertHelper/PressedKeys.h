#pragma once

/// The keys that are down at this moment.
///
/// Threads: GTK's one. Errors: none. Only X11 can be asked; a Wayland compositor sends no repetitions of keys that were down
/// before the window had the keyboard.

#include <gdk/gdk.h>

#include <set>

namespace palisade {

/// Their hardware codes, as events of `display` carry them.
std::set<unsigned> pressedKeys(GdkDisplay* display);

}  // namespace palisade
