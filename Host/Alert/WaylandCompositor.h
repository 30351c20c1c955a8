#pragma once

/// What a Wayland compositor offers its clients.
///
/// Threads: a plain function; it waits for the compositor, for half a second at most. Ownership: borrows the connection.
/// Errors: none; a compositor that does not answer, or talks nonsense, offers nothing.

#include <string_view>

namespace palisade {

class FileDescriptor;

/// Whether the compositor at the other end of `connection`, to which nothing was sent yet, has a global of that interface.
bool offersGlobal(const FileDescriptor& connection, std::string_view interface);

}  // namespace palisade
