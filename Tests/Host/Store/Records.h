#pragma once

/// Clients and records for tests of the account store, and the directory that knows these clients.

#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "Host/Accounts/ClientDirectory.h"
#include "Host/Accounts/RememberedClient.h"
#include "Platform/AccountType.h"
#include "Platform/ClientAuthorization.h"

namespace palisade {

inline const AccountType facebookType("com.veltran.accounttype.facebook");
inline const AccountType otherType("org.example.accounttype.other");

/// A client whose ID in the store is `id`; its description says the same.
inline std::shared_ptr<const Client> makeClient(const std::string& id) {
  return std::make_shared<RememberedClient>(id, "bundle." + id, "App " + id);
}

/// Knows the clients that were introduced to it.
class TestDirectory final : public ClientDirectory {
 public:
  void introduce(const std::shared_ptr<const Client>& client) { _known[client->description()] = client; }

  std::string idOfClient(const Client& client) const override { return client.description(); }
  std::shared_ptr<const Client> clientWithID(const std::string& id) const override {
    const auto found = _known.find(id);
    return found == _known.end() ? nullptr : found->second;
  }

 private:
  std::map<std::string, std::shared_ptr<const Client>> _known;
};

/// What a record says, apart from whose it is; prints and compares.
struct RecordContent {
  bool isGranted = false;
  std::optional<Dictionary> options = std::nullopt;
  std::optional<std::vector<std::string>> permissions = std::nullopt;

  friend bool operator==(const RecordContent&, const RecordContent&) = default;
};

ClientAuthorization makeRecord(const std::shared_ptr<const Client>& client, const RecordContent& content);

/// None of no record.
std::optional<RecordContent> contentOf(const std::shared_ptr<const ClientAuthorization>& record);

void PrintTo(const RecordContent& content, std::ostream* stream);

/// A grant as it usually looks; `number` shows in its options and its permissions.
RecordContent grantNumber(int number);

inline const RecordContent refusal{.isGranted = false};

}  // namespace palisade
