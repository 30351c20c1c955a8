#pragma once

/// Who the clients are that the store keeps records of.
///
/// Threads: every operation is called from any thread, several at a time; nothing of the store is locked meanwhile.
/// Ownership: the directory outlives the store. Errors: an exception reaches the caller of the store's operation, which has
/// then changed nothing.

#include <memory>
#include <string>

namespace palisade {

class Client;

class ClientDirectory {
 public:
  virtual ~ClientDirectory() = default;

  /// What the store keeps the client's records under: the same for every object that stands for the client, and in every run of
  /// the daemon.
  virtual std::string idOfClient(const Client& client) const = 0;

  /// The client of that ID, or none when it is not known any more; the store then remembers what it was called.
  virtual std::shared_ptr<const Client> clientWithID(const std::string& id) const = 0;
};

}  // namespace palisade
