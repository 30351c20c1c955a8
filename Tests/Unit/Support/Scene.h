#pragma once

/// One plug-in object on one scripted platform, with one client that calls it.
///
/// A scene starts without accounts and without records; a test adds what it needs and carries out one operation after the
/// other. Each operation runs as the daemon runs it, on a thread of its own, with the server's answers handed over when it
/// waits or has returned, and has to call its completion exactly once; otherwise the test fails.
/// Threads: used by the test's thread. Ownership: the platform lives as long as the process.

#include <cstddef>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include <gtest/gtest.h>

#include "Host/Json/Json.h"
#include "Platform/AccountConstants.h"
#include "Platform/AccountType.h"
#include "Testing/FakePlatform.h"
#include "Tests/Unit/Support/PluginUnderTest.h"
#include "Tests/Unit/Support/Values.h"

namespace palisade {

inline FakePlatform& freshPlatform() {
  static const auto parser = std::make_shared<const NlohmannJsonParser>();
  return FakePlatform::create(parser);
}

inline FakeClientData photosClient() {
  return {.id = "photos",
          .bundleID = "org.example.photos",
          .appName = "Photos",
          .description = "org.example.photos (Photos)",
          .entitlements = {}};
}

inline FakeClientData photosClientEntitledTo(std::string_view entitlement) {
  FakeClientData client = photosClient();
  client.entitlements.emplace_back(entitlement);
  return client;
}

/// What a test puts into the store or finds there.
struct RecordData {
  bool granted = true;
  std::optional<Dictionary> options = std::nullopt;
  std::optional<PermissionSet> permissions = std::nullopt;

  friend bool operator==(const RecordData&, const RecordData&) = default;
};

inline void PrintTo(const RecordData& record, std::ostream* stream) {
  *stream << (record.granted ? "granted " : "refused ")
          << (record.permissions ? describe(*record.permissions) : "without permissions") << ", "
          << (record.options ? compactJson(*record.options) : "no options");
}

class Scene {
 public:
  explicit Scene(FakeClientData clientData = photosClient(), FakePlatform& onPlatform = freshPlatform())
      : platform(onPlatform),
        plugin(std::make_shared<PluginUnderTest>(platform.services())),
        client(platform.makeClient(std::move(clientData))),
        authorizations({platform.trace, platform.faults}),
        store(std::make_shared<FakeAccountStore>(Instruments{platform.trace, platform.faults}, authorizations)) {}

  FakePlatform& platform;
  const std::shared_ptr<PluginUnderTest> plugin;
  const std::shared_ptr<const AccountType> facebook =
      std::make_shared<const AccountType>(std::string(AccountTypeIdentifierFacebook));
  const std::shared_ptr<const FakeClient> client;
  FakeAuthorizationManager authorizations;
  const std::shared_ptr<FakeAccountStore> store;

  /// A Facebook account whose own token is "master token of ID".
  void addAccount(const std::string& id = "me") {
    store->addAccount({.id = id, .type = facebook->identifier(), .description = "account " + id});
    platform.keychain.addCredential(id, std::nullopt, "master token of " + id);
  }

  /// An account object as a look-up answers it.
  std::shared_ptr<Account> makeAccount(const std::string& id = "me") {
    platform.keychain.addCredential(id, std::nullopt, "master token of " + id);
    return std::make_shared<FakeAccount>(
        Instruments{platform.trace, platform.faults},
        FakeAccountData{.id = id, .type = facebook->identifier(), .description = "account " + id});
  }

  void addRecord(const RecordData& data) { addRecord(data, client); }
  void addRecord(const RecordData& data, std::shared_ptr<const Client> ofClient) {
    ClientAuthorization record(std::move(ofClient));
    record.setIsGranted(data.granted);
    if (data.options) record.setOptions(std::make_shared<const Dictionary>(*data.options));
    if (data.permissions) record.setGrantedPermissions(std::make_shared<const PermissionSet>(*data.permissions));
    authorizations.addRecord(record, facebook->identifier());
  }

  /// What the store holds for the client, or none.
  std::optional<RecordData> record() const {
    const auto found = authorizations.recordOf(*client, facebook->identifier());
    if (found == nullptr) return std::nullopt;
    RecordData data{.granted = found->isGranted()};
    if (found->options() != nullptr) data.options = *found->options();
    if (found->grantedPermissions() != nullptr) data.permissions = *found->grantedPermissions();
    return data;
  }

  CompletionCall requestAccess(const std::optional<Dictionary>& options, bool allowUserInteraction = true) {
    return perform([&](const AccessCompletion& completion) {
      const auto given = options ? std::make_shared<const Dictionary>(*options) : nullptr;
      plugin->handleAccessRequestToAccountsOfType(facebook, client, given, store, allowUserInteraction, completion);
    });
  }

  CompletionCall authorize() {
    return perform([&](const AccessCompletion& completion) {
      plugin->authorizeAccessToAccountsOfType(facebook, client, store, completion);
    });
  }

  CompletionCall revoke() {
    return perform(
        [&](const AccessCompletion& completion) { plugin->revokeAccessToAccountsOfType(facebook, client, store, completion); });
  }

  CompletionCall revokeAll() {
    return perform(
        [&](const AccessCompletion& completion) { plugin->revokeAllAccessToAccountsOfType(facebook, store, completion); });
  }

  /// Runs `operation`, which hands its argument to the plug-in, and answers the one call of the completion.
  CompletionCall perform(const std::function<void(const AccessCompletion&)>& operation) {
    const std::size_t earlier = platform.completions().size();
    const OperationEnd end = platform.run([&] { operation(platform.completion()); });
    EXPECT_EQ(end, OperationEnd::returned);
    return onlyCompletionAfter(earlier);
  }

  /// The same on the calling thread, for an operation that waits for nobody but the threads that it starts itself.
  CompletionCall performHere(const std::function<void(const AccessCompletion&)>& operation) {
    const std::size_t earlier = platform.completions().size();
    operation(platform.completion());
    return onlyCompletionAfter(earlier);
  }

 private:
  CompletionCall onlyCompletionAfter(std::size_t earlier) const {
    const std::vector<CompletionCall> calls = platform.completions();
    EXPECT_EQ(calls.size() - earlier, 1U) << "A completion is called exactly once.";
    return calls.size() > earlier ? calls.back() : CompletionCall{};
  }
};

}  // namespace palisade
