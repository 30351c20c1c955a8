#pragma once

/// A platform that costs as little as a platform can, so that a figure shows the plug-in and not its surroundings.
///
/// Everything is in memory and answers at once, on the calling thread: the user, the server and the parser have their answer
/// ready. Debug records are switched off, as in an installation. Threads: one. Ownership: lives longer than the plug-ins that
/// use it; one a process, because the plug-in keeps its preferences queue for the life of the process.

#include <memory>
#include <string>

#include "Platform/AccountAccessPlugin.h"
#include "Platform/AccountStore.h"
#include "Platform/Client.h"
#include "Platform/ClientAuthorization.h"
#include "Platform/SystemAlert.h"

namespace palisade {

class InMemoryServices {
 public:
  InMemoryServices();
  ~InMemoryServices();

  PlatformServices services();

  /// A store with one Facebook account, which hands out a copy of `record` for every client (none is a null pointer), as a
  /// store that keeps its records detached has to, and forgets what it is told to store.
  std::shared_ptr<AccountStore> makeStore(std::shared_ptr<const ClientAuthorization> record) const;

  std::shared_ptr<const Client> makeClient() const;

  std::shared_ptr<Account> makeAccount() const;

  /// What the user answers to every alert from now on; refuses at first.
  void answerAlertsWith(AlertResponse response);

 private:
  struct Services;

  std::unique_ptr<Services> _services;
};

}  // namespace palisade
