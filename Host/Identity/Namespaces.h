#pragma once

/// Which users, files and processes a process sees: the namespaces that make a sandbox.
///
/// Threads: plain functions. Errors: none when the kernel does not let this process look.

#include <array>
#include <optional>

#include "Host/Files/FileDescriptor.h"

namespace palisade {

/// Of users, of mounts and of processes; none where the kernel has no such namespaces.
using Namespaces = std::array<std::optional<FileIdentity>, 3>;

/// Of the process with this folder in /proc.
std::optional<Namespaces> namespacesIn(const FileDescriptor& processFolder);

}  // namespace palisade
