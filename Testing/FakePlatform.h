#pragma once

/// A whole platform in memory, for tests of plug-ins and for the scenario runner.
///
/// Every service is a fake that records each call in `trace`, fails on demand, and answers from a script. A test of a plug-in
/// reads like this:
///
///     FakePlatform& platform = FakePlatform::create(std::make_shared<NlohmannJsonParser>());
///     platform.store->addAccount({.id = "1", .type = std::string(AccountTypeIdentifierFacebook), .description = "me"});
///     platform.keychain.addCredential("1", std::nullopt, "master token");
///     platform.alert.answers = {userAllows()};
///     platform.social.authorizationAnswers = {{.data = R"({"access_token": "T", "permissions": ["email"]})"}};
///     const auto client = platform.makeClient({.id = "photos", .bundleID = "org.example.photos", .appName = "Photos"});
///
///     const auto plugin = std::make_shared<MyPlugin>(platform.services());
///     const OperationEnd end = platform.run([&] {
///       plugin->handleAccessRequestToAccountsOfType(type, client, options, platform.store, true, platform.completion());
///     });
///
///     EXPECT_EQ(end, OperationEnd::returned);
///     EXPECT_THAT(platform.completions(), ElementsAre(FieldsAre(true, std::nullopt)));
///     EXPECT_THAT(platform.trace.names(), Contains("SystemAlert.createAlert"));
///
/// To see what the plug-in answers when any one of its platform calls fails:
///
///     for (std::size_t n = 1;; ++n) {
///       FakePlatform& platform = ...;
///       platform.faults.throwOnCall(n);
///       platform.run(...);
///       if (!platform.faults.hasThrown()) break;  // the operation has fewer calls than n
///       EXPECT_THAT(platform.completions(), ElementsAre(FieldsAre(false, Ne(std::nullopt))));
///     }
///
/// Threads: set up by one thread; the services are safe from every thread. Ownership: a platform lives until the process ends,
/// as the daemon's does: a plug-in may keep registrations and queues in process-wide state, and an operation that waits for
/// ever needs its platform for as long. Errors: those that a test asks for; everything else succeeds.

#include <cstddef>
#include <functional>
#include <memory>
#include <mutex>
#include <optional>
#include <vector>

#include "Platform/AccountAccessPlugin.h"
#include "Testing/Deliveries.h"
#include "Testing/FakeAccountStore.h"
#include "Testing/FakeAuthorizationManager.h"
#include "Testing/FakeClient.h"
#include "Testing/FakeJsonParser.h"
#include "Testing/FakeKeychainManager.h"
#include "Testing/FakeLog.h"
#include "Testing/FakeNotificationBus.h"
#include "Testing/FakePreferencesStore.h"
#include "Testing/FakeSerialQueue.h"
#include "Testing/FakeSocialFramework.h"
#include "Testing/FakeStringTable.h"
#include "Testing/FakeSystemAlert.h"
#include "Testing/FaultInjector.h"
#include "Testing/Trace.h"

namespace palisade {

/// How `FakePlatform::run` left an operation.
enum class OperationEnd {
  returned,
  waitsForAlert,     ///< it waits for ever for the user
  waitsForSemaphore  ///< it waits for ever for something else, such as a server that never answers
};

/// One call of a completion.
struct CompletionCall {
  bool granted = false;
  std::optional<Error> error;
};

struct FakePlatform {
  /// `parser` is the real one; `strings` lies below the texts that a test sets itself and may be null.
  static FakePlatform& create(std::shared_ptr<const JsonParser> parser, std::shared_ptr<const StringTable> strings = nullptr);

  FakePlatform(const FakePlatform&) = delete;
  FakePlatform& operator=(const FakePlatform&) = delete;

  PlatformServices services();

  std::shared_ptr<const FakeClient> makeClient(FakeClientData data);

  /// A completion that remembers its calls and writes them into the trace as `completion` of operation number `operation`.
  AccessCompletion completion(std::size_t operation = 0);

  /// Every call of every completion so far, in order.
  std::vector<CompletionCall> completions() const;

  /// Carries out an operation on a daemon thread, and hands the server's answers over, one after the other, each when the
  /// operation waits or has returned. Comes back when the operation has returned and nothing is left to do, or when nothing
  /// could wake it any more; that thread is then left where it is. One call at a time in a process.
  OperationEnd run(std::function<void()> operation);

  Trace trace;
  FaultInjector faults;
  Deliveries deliveries;

  FakeLog log;
  FakeKeychainManager keychain;
  FakeSocialFramework social;
  FakeSystemAlert alert;
  FakePreferencesStore preferences;
  FakeNotificationBus notifications;
  FakeSerialQueueFactory queues;
  FakeJsonParser json;
  FakeStringTable strings;
  FakeAuthorizationManager authorizations;
  const std::shared_ptr<FakeAccountStore> store;

 private:
  FakePlatform(std::shared_ptr<const JsonParser> parser, std::shared_ptr<const StringTable> below);

  Instruments instruments() { return {trace, faults}; }

  mutable std::mutex _completionsMutex;
  std::vector<CompletionCall> _completions;
};

}  // namespace palisade
