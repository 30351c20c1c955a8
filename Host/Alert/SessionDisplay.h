#pragma once

/// The display of the session that the daemon belongs to.
///
/// Threads: safe from every thread, as long as nobody changes the environment at that moment. Errors: none; what cannot be
/// reached is not usable.

namespace palisade {

/// Whether a window could be shown: WAYLAND_DISPLAY or DISPLAY names a display server of this machine that takes connections. A
/// display that is forwarded from another machine is not one: whoever asks through it may sit anywhere.
bool hasUsableDisplay();

/// Whether windows of any program can be kept above all others there: on X11, and on Wayland where the compositor has layers
/// (zwlr_layer_shell_v1). Waits for a compositor half a second at most.
bool keepsWindowsOnTop();

}  // namespace palisade
