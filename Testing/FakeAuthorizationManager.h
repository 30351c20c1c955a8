#pragma once

/// The records of a test's store. See `AuthorizationManager`.
///
/// It hands out detached copies: changing one changes nothing in the store. Threads: safe from every thread. Errors: one switch
/// a refusal; a refused change changes nothing.

#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <vector>

#include "Platform/AuthorizationManager.h"
#include "Testing/Instruments.h"

namespace palisade {

class FakeAuthorizationManager final : public AuthorizationManager {
 public:
  explicit FakeAuthorizationManager(Instruments instruments) : _instruments(instruments) {}

  /// Puts a record into the store before the plug-in looks; not traced.
  void addRecord(const ClientAuthorization& record, const std::string& accountTypeIdentifier);

  /// A detached copy of what the store holds for a client, or none; not traced.
  std::shared_ptr<ClientAuthorization> recordOf(const Client& client, const std::string& accountTypeIdentifier) const;

  /// Element n is what the n-th `setAuthorization` from now on answers; past the end every record is stored.
  void answerWrites(std::vector<std::optional<Error>> answers);
  /// What `removeAllClientAuthorizationsForAccountType` answers.
  void answerRemovals(std::optional<Error> answer);

  std::shared_ptr<ClientAuthorization> authorizationForClient(const std::shared_ptr<const Client>& client,
                                                              const AccountType& accountType) override;
  std::vector<std::shared_ptr<ClientAuthorization>> allAuthorizationsForAccountType(const AccountType& accountType) override;
  std::optional<Error> setAuthorization(const ClientAuthorization& authorization,
                                        const std::shared_ptr<const Client>& forClient,
                                        const AccountType& onAccountType) override;
  std::optional<Error> removeAllClientAuthorizationsForAccountType(const AccountType& accountType) override;

 private:
  struct Entry {
    std::string clientID;
    std::string accountTypeIdentifier;
    ClientAuthorization record;
  };

  void put(Entry entry);

  Instruments _instruments;
  mutable std::mutex _mutex;
  std::vector<Entry> _entries;
  std::vector<std::optional<Error>> _writeAnswers;
  std::size_t _writes = 0;
  std::optional<Error> _removalAnswer;
};

}  // namespace palisade
