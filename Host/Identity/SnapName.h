#pragma once

/// Which snap a process belongs to, from what the kernel says about it.
///
/// The security label is set by snapd's own launcher and enforced by the kernel. Where the kernel has no such labels, the
/// cgroup that snapd asked the service manager for is all there is. Threads: pure functions. Errors: `IdentityError` for a
/// label or cgroup that begins like a snap's and is none, and for cgroups that contradict each other.

#include <optional>
#include <string>
#include <string_view>

namespace palisade {

struct Snap {
  /// The snap, with its instance key if it has one.
  std::string name;
  /// The application within the snap.
  std::string application;
  /// False for a snap that the kernel only watches (classic confinement, developer mode).
  bool isConfined;

  friend bool operator==(const Snap&, const Snap&) = default;
};

/// From a security label such as "snap.photos.viewer (enforce)"; none for other labels.
std::optional<Snap> snapOfLabel(std::string_view label);

/// From the lines of /proc/PID/cgroup; none when no line names a snap.
std::optional<Snap> snapOfCgroups(std::string_view cgroups);

}  // namespace palisade
