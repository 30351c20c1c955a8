#pragma once

/// A client application with a record in the daemon's registry, or a program without one.
///
/// Threads: immutable. Ownership: shared. Errors: none.

#include <string>
#include <vector>

#include "Platform/Client.h"

namespace palisade {

/// How certain it is that a caller is the application it looks like.
enum class ClientClass {
  sandboxed,       ///< the sandbox says so, and the program cannot change what it says
  unknownSandbox,  ///< in a sandbox that does not say who is inside; known by its executable, and nobody vouches for it
  unit,            ///< the service manager says so; a program of the same user could have asked for the unit
  bare             ///< known by its executable only; all bare programs of a user trust each other
};

/// "sandboxed", "unknown sandbox", "unit", "bare".
std::string nameOf(ClientClass clientClass);

class RegisteredClient final : public Client {
 public:
  struct Description {
    /// What grants are recorded under: the bundle ID, or the executable's path for a program without a record, behind
    /// "sandbox:" when it runs in a sandbox that does not say who is inside.
    std::string id;
    std::optional<std::string> bundleID;
    std::string name;
    ClientClass clientClass = ClientClass::bare;
    std::vector<std::string> entitlements;
    /// The record's file; empty for a program without one.
    std::string recordFile;
    /// Whether no program of the user outside sandboxes can look like it.
    bool isBeyondImitation = false;
  };

  explicit RegisteredClient(Description description) : _description(std::move(description)) {}

  const std::string& id() const { return _description.id; }
  ClientClass clientClass() const { return _description.clientClass; }
  bool isBeyondImitation() const { return _description.isBeyondImitation; }
  /// Whether a sandbox confines it, of whatever kind. Then it manages nothing.
  bool isInSandbox() const {
    return _description.clientClass == ClientClass::sandboxed || _description.clientClass == ClientClass::unknownSandbox;
  }
  const std::vector<std::string>& entitlements() const { return _description.entitlements; }
  const std::string& recordFile() const { return _description.recordFile; }

  std::optional<std::string> bundleID() const override { return _description.bundleID; }
  std::string localizedAppName() const override { return _description.name; }
  bool hasEntitlement(std::string_view entitlement) const override;
  std::string description() const override { return _description.id; }

 private:
  Description _description;
};

}  // namespace palisade
