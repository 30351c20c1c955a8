#pragma once

/// A fixture with an account store of its own, which can be closed and opened again.

#include <gtest/gtest.h>

#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "Host/Accounts/SqliteAccountStore.h"
#include "Tests/Host/Store/InMemory.h"
#include "Tests/Host/Store/Records.h"
#include "Tests/Host/TemporaryFolder.h"

namespace palisade {

class AccountStoreFixture : public testing::Test {
 protected:
  AccountStoreFixture() { restart(); }

  AccountStoreOptions options() {
    return {.path = path, .onChange = [this](const StoreChange& change) { changes.push_back(change); }};
  }

  void restart() {
    store.reset();
    store = std::make_unique<SqliteAccountStore>(options(), directory);
  }

  std::optional<Error> set(const std::string& clientID, const RecordContent& content, const AccountType& type = facebookType) {
    const auto client = makeClient(clientID);
    return store->setAuthorization(makeRecord(client, content), client, type);
  }

  std::optional<Error> setByNobody(const std::string& clientID, const RecordContent& content = refusal) {
    const auto client = makeClient(clientID);
    return store->setAuthorizationAnsweredByNobody(makeRecord(client, content), client, facebookType);
  }

  std::optional<RecordContent> get(const std::string& clientID, const AccountType& type = facebookType) {
    return contentOf(store->authorizationForClient(makeClient(clientID), type));
  }

  TemporaryFolder folder;
  const std::filesystem::path path = folder.path() / "state" / "accounts.sqlite";
  TestDirectory directory;
  std::vector<StoreChange> changes;
  std::unique_ptr<SqliteAccountStore> store;
};

}  // namespace palisade
