#pragma once

/// Whose server is at the other end of a connection.
///
/// Threads: a plain function. Ownership: borrows the connection. Errors: what the kernel does not tell is not this user's.

namespace palisade {

/// Whether the other end of a connected socket belongs to this user or to root, on this machine.
bool isOwnServer(int connection);

}  // namespace palisade
