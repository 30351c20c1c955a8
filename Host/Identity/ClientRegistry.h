#pragma once

/// Who is calling: from the bus and the kernel, never from what the caller says.
///
/// The process behind the connection is pinned, by the bus or with pidfd_open(2); it must be the one that made the connection
/// (see ConnectionOwner.h) and this user's. Only then /proc is read, in this order: the Flatpak instance file, the snap's
/// security label or cgroup, the systemd unit, the executable. The first that says something decides. Client records (one TOML
/// file an application, see ClientRecord.h) give the application a bundle ID, a name, and entitlements; entitlements count only
/// from files below the system's folders that root alone can change.
///
/// Whoever has other namespaces of users, mounts or processes than the process that holds the bus is in a sandbox too. When no
/// information that is known here says who it is, no record fits it: it is known by the path of its executable behind
/// "sandbox:". Two sandboxes of that kind that run one program are one client.
///
/// Without a record, a sandboxed application is known by the ID that its sandbox gives it, and any other program by the path of
/// its executable alone, without a bundle ID. A script is its interpreter. What tells programs of one user apart holds against
/// mistakes and against sandboxed applications; a program outside every sandbox can preload a library into another one, ask for
/// a unit of any name, or build a sandbox that looks like any application's. Such programs of one user trust each other.
/// Threads: safe from every thread, as long as nobody changes the environment at that moment; names are looked up in the
/// language that it names. Ownership: clients are shared. Errors: `IdentityError`; a look-up that fails refuses, and there is
/// no default identity.

#include <filesystem>
#include <memory>
#include <string>
#include <vector>

#include "Host/Identity/CallingConnection.h"
#include "Host/Identity/IdentityError.h"
#include "Host/Identity/RegisteredClient.h"

namespace palisade {

class ClientRegistry {
 public:
  /// Records are read from `*.toml` in the folders, once; the first folder that has a bundle ID wins. A record that cannot be
  /// read is left out and told in `troubles`.
  /// Entitlements count below those of the folders that are the system's.
  explicit ClientRegistry(const std::vector<std::filesystem::path>& folders,
                          const std::vector<std::filesystem::path>& systemFolders = {});
  ~ClientRegistry();

  ClientRegistry(const ClientRegistry&) = delete;
  ClientRegistry& operator=(const ClientRegistry&) = delete;

  /// The client behind a connection. What the connection's functions throw refuses too.
  std::shared_ptr<const RegisteredClient> identify(const CallingConnection& connection) const;

  /// The client that grants are recorded under, or none when no record has that ID any more. Its class is the weakest by which
  /// its record lets a caller in.
  std::shared_ptr<const RegisteredClient> clientWithID(const std::string& id) const;

  std::vector<std::shared_ptr<const RegisteredClient>> clients() const;

  /// Records that were left out and entitlements that do not count, each with the file and the reason.
  std::vector<std::string> troubles() const;

 private:
  struct Implementation;
  std::unique_ptr<const Implementation> _implementation;
};

}  // namespace palisade
