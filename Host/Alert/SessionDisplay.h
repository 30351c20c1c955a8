#pragma once

/// The display of the session that the daemon belongs to.
///
/// A display server shows what it wants and says what it wants about keys and clicks, so it has to be this user's own, or
/// root's: the kernel tells whose it is, of the very connection that is made. One that is reached over the network can be
/// anybody's, and is used only if it was named in the configuration. Threads: safe from every thread, as long as nobody changes
/// the environment at that moment. Errors: none; what cannot be reached is not usable.

#include <optional>
#include <string>

namespace palisade {

/// Whether a window could be shown: WAYLAND_DISPLAY or DISPLAY names a display server of this machine that takes connections
/// and belongs to this user or to root, or DISPLAY is `networkDisplay` and that takes connections. A server of another user in
/// either place makes the display unusable, whatever the other one names: a window could be shown there. Waits for a network
/// half a second at most.
bool hasUsableDisplay(const std::optional<std::string>& networkDisplay = std::nullopt);

/// Whether windows of any program can be kept above all others there: on X11, and on Wayland where the compositor has layers
/// (zwlr_layer_shell_v1). Waits for a compositor half a second at most.
bool keepsWindowsOnTop();

}  // namespace palisade
