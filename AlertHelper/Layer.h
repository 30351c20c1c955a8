#pragma once

/// Windows above all others on Wayland, where the compositor offers layers.
///
/// Threads: GTK's one. Errors: none; without layers the window stays an ordinary one.

#include <gtk/gtk.h>

namespace palisade {

/// Puts a window that was not shown yet into the overlay layer and gives it the keyboard alone. False when it cannot be done.
bool becomeLayer(GtkWindow& window);

}  // namespace palisade
