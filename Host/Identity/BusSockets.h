#pragma once

/// Which of its open sockets connect a process with the bus, as the kernel's socket diagnosis tells it.
///
/// Threads: a plain function. Errors: none when the kernel does not tell: it lacks the diagnosis, refuses it, or the process
/// has a network of its own, whose sockets nobody sees from here.

#include <sys/types.h>

#include <cstddef>
#include <cstdint>
#include <optional>
#include <set>
#include <string>

#include "Host/Files/FileDescriptor.h"

namespace palisade {

/// What the kernel calls a socket. No two that exist have the same.
using SocketInode = std::uint32_t;

/// `processFolder` is the process's in /proc. A socket counts when its other end has the bus's address or is held by the bus's
/// process, which may listen at several addresses. Stops at `enough`.
std::optional<std::set<SocketInode>> socketsToBus(const FileDescriptor& processFolder, const std::string& busAddress,
                                                  pid_t busProcess, std::size_t enough);

}  // namespace palisade
